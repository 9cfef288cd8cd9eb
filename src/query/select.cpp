#include "common/report.h"
#include "kelosyslog/utils.h"
#include "query/condition_text.h"
#include "query/search.h"
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
             const RowReceiver &receiver) {
    const int rowCount = KELODBNumRows(result);
    _SYSLOG_LOG_DATA_tag log;
    for (int i = 0; i < rowCount; ++i) {
        uint32_t row = 0;
        if (!FetchOrFail(result, dbPath, row))
            return -1;
        if (receiver.callback == nullptr)
            continue;
        if (DBRecToLogInfo(table, result, row, &log, receiver.trimUser) != 0 ||
            receiver.callback(log, receiver.context) != 0)
            return 0;
    }
    return 0;
}

} // namespace

bool WriteSelect(const Question &question, Statement &statement) {
    std::string body;
    if (SyslogSQLCondListStrGen(question.conditions, body) != 0) {
        ReportError("fail to get sql condition list");
        return false;
    }
    const _SYSLOG_SQL_LIMIT_tag *limit = question.limit;
    const bool isUnfiltered = IsMatchAll(body);
    const bool pagesById = isUnfiltered && limit != nullptr && limit->limit != 0;
    statement.sql = SelectText(question.table, body, pagesById ? limit : nullptr, question.order);
    statement.page = isUnfiltered ? nullptr : limit;
    return true;
}

int RunSelect(DBConnect_tag *connection, const std::string &dbPath, const std::string &table,
              const Statement &statement, const RowReceiver &receiver) {
    DbResult result;
    if (!RunQueryOrFail(connection, dbPath, statement.sql, statement.page, result)) {
        ReportError("fail to execute database command (" + statement.sql + ")");
        return -1;
    }
    return WalkRows(result.get(), dbPath, table, receiver);
}

void ReportFailedConnection(const std::string &dbPath) {
    ReportError("fail to connect database (" + dbPath + ")");
}

} // namespace kelo

using namespace kelo;

int SyslogDBSelectByTable(const std::string &dbPath, const std::string &table,
                          const std::list<_SYSLOG_SQL_COND_tag> &conditions, _SYSLOG_SQL_LIMIT_tag *limit,
                          _SYSLOG_SQL_ORDER_tag *order, SyslogDBRowCallback callback, void *context,
                          bool trimUser) {
    if (!CheckDbPath(dbPath, 472))
        return -1;
    Statement statement;
    if (!WriteSelect({table, conditions, limit, order}, statement))
        return -1;
    const DbConnection connection = ConnectOrFail(dbPath);
    if (connection == nullptr) {
        ReportFailedConnection(dbPath);
        return -1;
    }
    return RunSelect(connection.get(), dbPath, table, statement, {callback, context, trimUser});
}

int SyslogDBSelect(const std::string &dbPath, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                   _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order, SyslogDBRowCallback callback,
                   void *context, bool trimUser) {
    return SyslogDBSelectByTable(dbPath, "logs", conditions, limit, order, callback, context, trimUser);
}
