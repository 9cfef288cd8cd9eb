#pragma once

// Appends records of one database to another one, each exactly once, whenever the program is killed: the id
// of the last one is stored in the transaction of the records.

#include <keloplatform/kelodb.h>
#include <kelosyslog/dbwriter.h>

#include <vector>

#include "../modern.h"

constexpr uint64_t kBatchRows = 100; // small, to be killed often here; a few thousand cost less
constexpr char kCreateCursor[] = "CREATE TABLE IF NOT EXISTS forwarded (id INTEGER)";

// Runs within the transaction of a batch. `context` is the id as a text.
inline int SaveCursor(DBConnect_tag *target, void *context) {
    const std::string insert = "INSERT INTO forwarded VALUES (" + *static_cast<std::string *>(context) + ")";
    for (const char *sql : {kCreateCursor, "DELETE FROM forwarded", insert.c_str()})
        if (KELODBExecute(target, sql, nullptr) < 0)
            return -1;
    return 0;
}

// The id of the last record that was stored, as a text; "0" for none. The first id is 1.
inline std::string LoadCursor(SyslogDBWriter &writer) {
    Check(writer.Open());
    DBConnect_tag *target = writer.ConnectionGet();
    DBResult_tag *result = nullptr;
    if (KELODBExecute(target, kCreateCursor, nullptr) < 0 ||
        KELODBExecute(target, "SELECT ifnull(max(id), 0) AS id FROM forwarded", &result) < 0)
        throw std::runtime_error(KELODBErrorGet(target));
    unsigned int row = 0;
    const bool isThere = KELODBFetchRow(result, &row) == 0;
    std::string cursor = isThere ? KELODBFetchField(result, row, "id") : "0";
    KELODBFreeResult(result);
    return cursor;
}

// Stores the records that meet the conditions and were not stored before. Returns the id of the last one that
// was ever stored.
inline std::string Forward(SyslogDBReader &reader, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                           SyslogDBWriter &writer) {
    for (std::string cursor = LoadCursor(writer);;) {
        auto later = conditions;
        later.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_GT, cursor, {}});
        std::vector<_SYSLOG_LOG_DATA_tag> batch;
        ForEachLog(reader, later, {kBatchRows, 0}, {1, SYSLOG_ATTRI_ID},
                   [&](const _SYSLOG_LOG_DATA_tag &log) { batch.push_back(log); });
        if (batch.empty())
            return cursor;
        cursor = std::to_string(batch.back().id);
        Check(writer.Store(batch.data(), batch.size(), SaveCursor, &cursor));
    }
}

// The exit status of a program that failed: 75 for what may work later.
inline int StatusOf(const Failure &failure) {
    return failure.kind == KELO_FAILURE_BUSY ? 75 : 1;
}
