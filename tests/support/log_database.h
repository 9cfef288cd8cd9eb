#pragma once

#include <sqlite3.h>

#include <memory>
#include <string>
#include <vector>

#include "kelosyslog/records.h"

namespace kelo::test {

// A plain connection of SQLite to the file at `path`, which is created with its folders when missing. Every
// failure is a std::runtime_error with SQLite's message.
class TestDatabase {
public:
    explicit TestDatabase(const std::string &path);
    // Runs SQL text, of any number of statements. Returns the first column of the first row; "" for no row or
    // NULL.
    std::string Run(const std::string &sql);
    sqlite3 *Get() { return db_.get(); }

private:
    std::unique_ptr<sqlite3, int (*)(sqlite3 *)> db_;
};

// Keeps a database locked while it lives, by this statement.
struct DatabaseLock : TestDatabase {
    explicit DatabaseLock(const std::string &path, const std::string &sql = "BEGIN IMMEDIATE")
        : TestDatabase(path) {
        Run(sql);
    }
};

// Runs SQL text through a connection of its own.
inline std::string RunSql(const std::string &path, const std::string &sql) {
    return TestDatabase(path).Run(sql);
}

// Creates a database from one of the shipped schemas, in WAL mode like a real one: "logs.sql", "archive.sql".
void CreateLogDatabase(const std::string &path, const std::string &schema = "logs.sql");

// Appends records to table "logs" in one transaction. `id` is left to SQLite where it is 0; both `prio` and
// `llevel` get the severity word.
void InsertLogs(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs);

// The same, and leaves the records in the write-ahead log next to the database, as a writer at work does.
void InsertLogsIntoWal(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs);

// A record that differs by `number` in a repeatable way: host "host00".."host49", program "prog00".."prog29",
// every severity, one log a second from 2020/01/01 00:00:00 UTC on, on which day it stays.
_SYSLOG_LOG_DATA_tag SampleLog(int number);

// The records SampleLog(0) to SampleLog(count - 1), appended.
void InsertSampleLogs(const std::string &path, int count);

// Damages every page but the first two of a closed database. Returns the file's content then.
std::string DamagePages(const std::string &path);

} // namespace kelo::test
