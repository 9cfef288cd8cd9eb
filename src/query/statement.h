#pragma once

#include <string>

#include "common/db_handles.h"
#include "kelosyslog/dbutil.h"

namespace kelo {

// Whether `path` can name a database: not empty, and beginning with '/'.
bool SyslogDBPathIsValid(const std::string &path);

// Checks a path, and reports one that cannot name a database under the given line number of the message.
bool CheckDbPath(const std::string &path, int line);

// Makes a path that cannot name a database the thread's last failure.
void FailForPath(const std::string &path);

// " ORDER BY column asc" or "... desc"; "" for null.
std::string OrderClause(const _SYSLOG_SQL_ORDER_tag *order);

// Runs `sql` and stores its rows in `result`: unchanged, or with a `page` through the platform's limited
// select, which takes the low 32 bits of the page's numbers. Returns false when the statement failed, and for
// a text with a NUL byte, which would silently cut the statement and with it a part of its filter.
bool RunQuery(DBConnect_tag *connection, const std::string &sql, const _SYSLOG_SQL_LIMIT_tag *page,
              DbResult &result);

// The same for a public function, which fails with it: a failure becomes the thread's last one.
bool RunQueryOrFail(DBConnect_tag *connection, const std::string &dbPath, const std::string &sql,
                    const _SYSLOG_SQL_LIMIT_tag *page, DbResult &result);

// Fetches a row that must be there, likewise.
bool FetchOrFail(DBResult_tag *result, const std::string &dbPath, uint32_t &row);

// The rows of one statement with their connection, for callers that do not distinguish between a failed
// connection and a failed statement.
struct Answer {
    DbConnection connection;
    DbResult result;
    bool isGood = false;
};
Answer Ask(const std::string &dbPath, const std::string &sql, const _SYSLOG_SQL_LIMIT_tag *page = nullptr);

// Runs the query and calls `take(result, row)` for every row, in order. Returns false when the connection,
// the statement or the fetch of a row failed; rows before it have been taken.
template <typename Take>
bool AskRows(const std::string &dbPath, const std::string &sql, const _SYSLOG_SQL_LIMIT_tag *page,
             Take take) {
    const Answer answer = Ask(dbPath, sql, page);
    if (!answer.isGood)
        return false;
    const int rowCount = KELODBNumRows(answer.result.get());
    for (int i = 0; i < rowCount; ++i) {
        uint32_t row = 0;
        if (!FetchOrFail(answer.result.get(), dbPath, row))
            return false;
        take(answer.result.get(), row);
    }
    return true;
}

} // namespace kelo
