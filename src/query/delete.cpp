#include "keloplatform/kelodb.h"
#include "query/condition_text.h"
#include "query/statement.h"

using namespace kelo;

int SyslogDBDelete(const std::string &dbPath, const std::list<_SYSLOG_SQL_COND_tag> &conditions) {
    if (!CheckDbPath(dbPath, 661))
        return -1;
    std::string body;
    // A condition that lost its value would delete what was never meant. One with a NUL byte, which would cut
    // the statement, has no text either.
    if (SyslogSQLCondListStrGen(conditions, body, LostValue::IsFailure) != 0)
        return -1;
    const std::string sql = "DELETE FROM logs" + (body.empty() ? "" : " WHERE " + body);

    const DbConnection connection = ConnectOrFail(dbPath);
    if (connection == nullptr)
        return -1;
    return KELODBExecute(connection.get(), sql.c_str(), nullptr) >= 0
               ? 0
               : FailStatement(connection.get(), dbPath, sql);
}
