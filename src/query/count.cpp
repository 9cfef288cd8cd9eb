#include <cstdlib>

#include "common/db_field.h"
#include "query/condition_text.h"
#include "query/statement.h"

using namespace kelo;

int SyslogDBSelectCountByTable(const std::string &dbPath, const std::string &table,
                               const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                               _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order) {
    if (!CheckDbPath(dbPath, 581))
        return -1;
    std::string body;
    if (SyslogSQLCondListStrGen(conditions, body) != 0)
        return -1;
    // The largest row id is found immediately in a table of any size.
    const char *expression = IsMatchAll(body) ? "max(rowid)" : "COUNT(*)";
    const std::string sql = std::string("SELECT ") + expression + " FROM " + table +
                            (body.empty() ? "" : " WHERE " + body) + OrderClause(order);

    const Answer answer = Ask(dbPath, sql, limit);
    uint32_t row = 0;
    if (!answer.isGood || !FetchOrFail(answer.result.get(), dbPath, row))
        return -1;
    if (KELODBNumRows(answer.result.get()) != 1) {
        Fail(KELO_FAILURE_OTHER, dbPath, sql, "the statement gave several rows");
        return -2;
    }
    return static_cast<int>(std::strtoll(FieldText(answer.result.get(), row, expression), nullptr, 10));
}

int SyslogDBSelectCount(const std::string &dbPath, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                        _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order) {
    return SyslogDBSelectCountByTable(dbPath, "logs", conditions, limit, order);
}
