#include <cstdlib>

#include "common/db_field.h"
#include "common/db_handles.h"
#include "common/failure.h"
#include "eventlog/event_database.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logger.h"

namespace {

constexpr int kMostRowsWithoutRotation = 19999;

int ReadTime(DBResult_tag *result, void *context) {
    uint32_t row = 0;
    if (result != nullptr && KELODBFetchRow(result, &row) >= 0)
        *static_cast<int64_t *>(context) = std::strtoll(kelo::FieldText(result, row, "time"), nullptr, 10);
    return 0;
}

// Runs the statements of a rotation up to the first failure. Returns "" or the statement that failed.
std::string RunRotation(DBHandler &db) {
    // Rows are removed by a cut-off of its own that stays 0: rotation never removes an event with a real
    // time.
    int64_t timeOfOldestKept = 0;
    const char *const select = "SELECT time FROM log ORDER BY time DESC LIMIT 1 OFFSET 18000";
    if (db.DBExecute(select, ReadTime, &timeOfOldestKept) < 0)
        return select;
    for (const char *sql : {"DELETE FROM log WHERE time <= 0", "VACUUM"}) {
        if (db.DBExecute(sql) < 0)
            return sql;
    }
    return "";
}

} // namespace

int Logger::LogCount(std::string dbPath) const {
    if (dbPath.empty() || dbPath.front() != '/') {
        Debuger::MSG(0, "Invalid syslog db path!");
        return kelo::Fail(KELO_FAILURE_ARGUMENT, dbPath, "", "the path is not absolute");
    }
    const kelo::DbConnection connection = kelo::ConnectOrFail(dbPath);
    if (connection == nullptr) {
        Debuger::MSG(0, "Fail to connect syslog log database");
        return -1;
    }
    DBResult_tag *raw = nullptr;
    constexpr char kCount[] = "SELECT COUNT(*) FROM log";
    if (KELODBExecute(connection.get(), kCount, &raw) < 0) {
        kelo::FailStatement(connection.get(), dbPath, kCount);
        Debuger::MSG(0, "Fail to select syslog log database");
        return -1;
    }
    const kelo::DbResult result(raw);
    uint32_t row = 0;
    if (KELODBFetchRow(result.get(), &row) < 0) {
        Debuger::MSG(0, "Fail to fetch row");
        return kelo::Fail(KELO_FAILURE_OTHER, dbPath, kCount, "the statement gave no row");
    }
    if (KELODBNumRows(result.get()) != 1) {
        kelo::Fail(KELO_FAILURE_OTHER, dbPath, kCount, "the statement gave several rows");
        return -2;
    }
    return static_cast<int>(std::strtol(kelo::FieldText(result.get(), row, "COUNT(*)"), nullptr, 10));
}

int Logger::LogRotation(std::string dbPath) const {
    if (LogCount(dbPath) <= kMostRowsWithoutRotation)
        return 0;
    kelo::EventDatabase db(dbPath);
    if (!db.Connect())
        return -1;
    const std::string failed = RunRotation(*db);
    if (!failed.empty()) {
        Debuger::MSG(0, "Fail to execute SQL command: " + failed);
        return -1;
    }
    return 0;
}
