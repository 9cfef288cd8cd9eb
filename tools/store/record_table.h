#pragma once

#include <span>

#include "base/sqlite.h"
#include "kelosyslog/records.h"

namespace kelo::tool {

// Records as a table of a connection, "kelo_records", from which one statement can insert them all:
//
//     RecordTable records(database);
//     records.Set(logs);
//     database.Run("INSERT INTO logs(host, msg) SELECT host, msg FROM kelo_records");
//
// Its columns are those of table logs without `id`, in the order of the records. SQLite reads the texts where
// they are. Per row this saves the calls of a prepared statement and reading and writing the last id, which
// AUTOINCREMENT asks for at every statement.
class RecordTable {
public:
    // The object must outlive the statements of `connection` that read the table.
    explicit RecordTable(SqliteConnection &connection);
    RecordTable(const RecordTable &) = delete;
    RecordTable &operator=(const RecordTable &) = delete;

    // The rows from now on; they must stay until the statement that reads them has ended.
    void Set(std::span<const _SYSLOG_LOG_DATA_tag> logs) { logs_ = logs; }

private:
    struct Functions;

    std::span<const _SYSLOG_LOG_DATA_tag> logs_;
};

} // namespace kelo::tool
