#include "query/statement.h"

#include "common/failure.h"
#include "common/report.h"
#include "query/condition_text.h"

namespace kelo {
namespace {

bool IsWhole(const std::string &sql) {
    return sql.find('\0') == std::string::npos;
}

} // namespace

bool SyslogDBPathIsValid(const std::string &path) {
    return !path.empty() && path.front() == '/';
}

bool CheckDbPath(const std::string &path, int line) {
    if (SyslogDBPathIsValid(path))
        return true;
    ReportErrorAt("dbutil", line, "Invalid syslog db path!");
    FailForPath(path);
    return false;
}

void FailForPath(const std::string &path) {
    Fail(KELO_FAILURE_ARGUMENT, path, "", "the path is not absolute");
}

std::string OrderClause(const _SYSLOG_SQL_ORDER_tag *order) {
    if (order == nullptr)
        return "";
    return std::string(" ORDER BY ") + ColumnText(order->attr) + (order->ascending != 0 ? " asc" : " desc");
}

bool RunQuery(DBConnect_tag *connection, const std::string &sql, const _SYSLOG_SQL_LIMIT_tag *page,
              DbResult &result) {
    if (!IsWhole(sql))
        return false;
    DBResult_tag *rows = nullptr;
    const int status = page != nullptr
                           ? KELODBSelectLimit(connection, sql.c_str(), static_cast<uint32_t>(page->limit),
                                               static_cast<uint32_t>(page->offset), &rows)
                           : KELODBExecute(connection, sql.c_str(), &rows);
    result.reset(rows);
    return status >= 0;
}

bool RunQueryOrFail(DBConnect_tag *connection, const std::string &dbPath, const std::string &sql,
                    const _SYSLOG_SQL_LIMIT_tag *page, DbResult &result) {
    if (RunQuery(connection, sql, page, result))
        return true;
    if (IsWhole(sql))
        FailStatement(connection, dbPath, sql);
    else
        Fail(KELO_FAILURE_ARGUMENT, dbPath, sql, "the statement holds a NUL byte");
    return false;
}

bool FetchOrFail(DBResult_tag *result, const std::string &dbPath, uint32_t &row) {
    if (KELODBFetchRow(result, &row) >= 0)
        return true;
    Fail(KELO_FAILURE_OTHER, dbPath, "KELODBFetchRow", "the statement gave no further row");
    return false;
}

Answer Ask(const std::string &dbPath, const std::string &sql, const _SYSLOG_SQL_LIMIT_tag *page) {
    Answer answer;
    answer.connection = ConnectOrFail(dbPath);
    answer.isGood = answer.connection != nullptr &&
                    RunQueryOrFail(answer.connection.get(), dbPath, sql, page, answer.result);
    return answer;
}

} // namespace kelo
