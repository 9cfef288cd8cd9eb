#pragma once

#include <sqlite3.h>

#include <memory>
#include <string>

namespace kelo::bench {

struct CloseDatabase {
    void operator()(sqlite3 *db) const { sqlite3_close(db); }
};
struct FinalizeQuery {
    void operator()(sqlite3_stmt *statement) const { sqlite3_finalize(statement); }
};
using Database = std::unique_ptr<sqlite3, CloseDatabase>;
using Query = std::unique_ptr<sqlite3_stmt, FinalizeQuery>;

// Plain SQLite, as what is measured against. Each ends the program when it fails.
Database OpenDatabase(const std::string &path);
Query Prepare(sqlite3 *db, const char *sql);
void Run(sqlite3 *db, const std::string &sql);

// Creates an empty accounting database of the shipped schema, with a write-ahead log, in place of one that is
// there. Returns its path, which is where the library looks for it below `root`.
std::string CreateAccountDatabase(const std::string &root);

// "device07"
std::string DeviceName(int number);

// Writes samples of 50 devices, one for each second from `first` on, with one prepared statement in one
// transaction.
void InsertSamples(sqlite3 *db, int first, int count);

} // namespace kelo::bench
