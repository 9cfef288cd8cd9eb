#pragma once

#include <sqlite3.h>

#include <memory>
#include <string>
#include <vector>

#include "kelosyslog/records.h"

namespace kelo::test {

// Runs SQL text (any number of statements) on the file at `path`, which is created when missing, through a
// plain SQLite connection of its own. Throws std::runtime_error with SQLite's message.
void RunSql(const std::string &path, const std::string &sql);

// First column of the first row of a query, as text; "" for no row or NULL.
std::string QueryText(const std::string &path, const std::string &sql);

// Creates a log database from one of the shipped schemas, in WAL mode like a real one: "logs.sql",
// "archive.sql".
void CreateLogDatabase(const std::string &path, const std::string &schema = "logs.sql");

// Appends records to table "logs" in one transaction. `id` is left to SQLite where it is 0; both `prio` and
// `llevel` get the severity word.
void InsertLogs(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs);

// The same, and leaves the records in the write-ahead log, as an active writer does.
void InsertLogsIntoWal(const std::string &path, const std::vector<_SYSLOG_LOG_DATA_tag> &logs);

// A record that differs by `number` in a repeatable way: host "host00".."host49", program "prog00".."prog29",
// every severity, one log a second from 2020/01/01 00:00:00 UTC on, on which day it stays.
_SYSLOG_LOG_DATA_tag SampleLog(int number);

// The records SampleLog(0) to SampleLog(count - 1), appended.
void InsertSampleLogs(const std::string &path, int count);

// Keeps a database locked while it lives, by this statement.
class DatabaseLock {
public:
    explicit DatabaseLock(const std::string &path, const std::string &sql = "BEGIN IMMEDIATE");
    void Run(const std::string &sql);

private:
    std::unique_ptr<sqlite3, int (*)(sqlite3 *)> db_;
};

// Makes every page but the first two of a closed database no page. Returns the file's content then.
std::string DamagePages(const std::string &path);

} // namespace kelo::test
