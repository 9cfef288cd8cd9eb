#include <cstdlib>

#include "common/db_field.h"
#include "query/condition_text.h"
#include "query/search.h"
#include "query/statement.h"

namespace kelo {

bool WriteCount(const Question &question, CountStatement &statement) {
    std::string body;
    if (SyslogSQLCondListStrGen(question.conditions, body) != 0)
        return false;
    // The largest row id is found immediately in a table of any size.
    statement.expression = IsMatchAll(body) ? "max(rowid)" : "COUNT(*)";
    statement.sql = std::string("SELECT ") + statement.expression + " FROM " + question.table +
                    (body.empty() ? "" : " WHERE " + body) + OrderClause(question.order);
    statement.page = question.limit;
    return true;
}

int RunCount(DBConnect_tag *connection, const std::string &dbPath, const CountStatement &statement) {
    DbResult result;
    uint32_t row = 0;
    if (!RunQueryOrFail(connection, dbPath, statement.sql, statement.page, result) ||
        !FetchOrFail(result.get(), dbPath, row))
        return -1;
    if (KELODBNumRows(result.get()) != 1) {
        Fail(KELO_FAILURE_OTHER, dbPath, statement.sql, "the statement gave several rows");
        return -2;
    }
    return static_cast<int>(std::strtoll(FieldText(result.get(), row, statement.expression), nullptr, 10));
}

} // namespace kelo

using namespace kelo;

int SyslogDBSelectCountByTable(const std::string &dbPath, const std::string &table,
                               const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                               _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order) {
    if (!CheckDbPath(dbPath, 581))
        return -1;
    CountStatement statement;
    if (!WriteCount({table, conditions, limit, order}, statement))
        return -1;
    const DbConnection connection = ConnectOrFail(dbPath);
    return connection != nullptr ? RunCount(connection.get(), dbPath, statement) : -1;
}

int SyslogDBSelectCount(const std::string &dbPath, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                        _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order) {
    return SyslogDBSelectCountByTable(dbPath, "logs", conditions, limit, order);
}
