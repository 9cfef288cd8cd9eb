#pragma once

#include <vector>

#include "kelosyslog/records.h"

struct sqlite3;

namespace kelo {

// Records as a table of a connection, "kelo_records", from which one statement can insert them all:
//
//     RecordTable records;
//     records.Register(database);
//     records.Set(logs);
//     RunStatement(..., "INSERT INTO logs(host, msg) SELECT host, msg FROM kelo_records");
//
// Its columns are those of table logs without `id`, in the order of the records. SQLite reads the texts where
// they are. Per row this saves the calls of a prepared statement and reading and writing the last id, which
// AUTOINCREMENT asks for at every statement.
class RecordTable {
public:
    RecordTable() = default;
    RecordTable(const RecordTable &) = delete;
    RecordTable &operator=(const RecordTable &) = delete;

    // Adds the table to a connection, which ends before this object does. Returns SQLite's result.
    int Register(sqlite3 *db);

    // The rows from now on; they must stay until the statement that reads them has ended. Returns the place
    // of the first record whose severity is none of 0 to 7, or the number of rows.
    template <typename Logs>
    size_t Set(const Logs &logs) {
        logs_.clear();
        logs_.reserve(logs.size());
        for (const _SYSLOG_LOG_DATA_tag &log : logs) {
            if (log.prio < SYSLOG_PRIO_EMERG || log.prio > SYSLOG_PRIO_DEBUG)
                break;
            logs_.push_back(&log);
        }
        return logs_.size();
    }

private:
    struct Functions;

    std::vector<const _SYSLOG_LOG_DATA_tag *> logs_;
};

} // namespace kelo
