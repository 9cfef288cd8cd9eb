#include "common/report.h"
#include "kelosyslog/utils.h"
#include "query/condition_text.h"
#include "query/statement.h"

namespace kelo {
namespace {

std::string SelectText(const std::string &table, const std::string &body,
                       const _SYSLOG_SQL_LIMIT_tag *pageById, const _SYSLOG_SQL_ORDER_tag *order) {
    std::string sql = "SELECT *";
    if (pageById != nullptr)
        sql += ", (SELECT max(rowid) FROM " + table + ") totalCount";
    sql += " FROM " + table;
    if (!body.empty())
        sql += " WHERE " + body;
    if (pageById != nullptr) {
        const std::string end = ullNumberToString(pageById->offset + pageById->limit);
        const std::string offset = ullNumberToString(pageById->offset);
        sql += body.empty() ? " WHERE " : " AND ";
        sql += "( id > totalCount - " + end + " AND id <= totalCount - " + offset + ")";
    }
    return sql + OrderClause(order);
}

// Passes the rows to the callback. Returns 0, also when the callback or a row without a conversion ended the
// scan, or -1 when a row could not be fetched.
int WalkRows(DBResult_tag *result, const std::string &dbPath, const std::string &table,
             SyslogDBRowCallback callback, void *context, bool trimUser) {
    const int rowCount = KELODBNumRows(result);
    _SYSLOG_LOG_DATA_tag log;
    for (int i = 0; i < rowCount; ++i) {
        uint32_t row = 0;
        if (!FetchOrFail(result, dbPath, row))
            return -1;
        if (callback == nullptr)
            continue;
        if (DBRecToLogInfo(table, result, row, &log, trimUser) != 0 || callback(log, context) != 0)
            return 0;
    }
    return 0;
}

} // namespace
} // namespace kelo

using namespace kelo;

int SyslogDBSelectByTable(const std::string &dbPath, const std::string &table,
                          const std::list<_SYSLOG_SQL_COND_tag> &conditions, _SYSLOG_SQL_LIMIT_tag *limit,
                          _SYSLOG_SQL_ORDER_tag *order, SyslogDBRowCallback callback, void *context,
                          bool trimUser) {
    if (!CheckDbPath(dbPath, 472))
        return -1;
    std::string body;
    if (SyslogSQLCondListStrGen(conditions, body) != 0) {
        ReportError("fail to get sql condition list");
        return -1;
    }
    const bool isUnfiltered = IsMatchAll(body);
    const bool pagesById = isUnfiltered && limit != nullptr && limit->limit != 0;
    const std::string sql = SelectText(table, body, pagesById ? limit : nullptr, order);

    const DbConnection connection = ConnectOrFail(dbPath);
    if (connection == nullptr) {
        ReportError("fail to connect database (" + dbPath + ")");
        return -1;
    }
    DbResult result;
    if (!RunQueryOrFail(connection.get(), dbPath, sql, isUnfiltered ? nullptr : limit, result)) {
        ReportError("fail to execute database command (" + sql + ")");
        return -1;
    }
    return WalkRows(result.get(), dbPath, table, callback, context, trimUser);
}

int SyslogDBSelect(const std::string &dbPath, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                   _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order, SyslogDBRowCallback callback,
                   void *context, bool trimUser) {
    return SyslogDBSelectByTable(dbPath, "logs", conditions, limit, order, callback, context, trimUser);
}
