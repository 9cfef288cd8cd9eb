#pragma once

// Plain SQLite, for what the library has no operation for: online backup, compaction and deletion by row.

#include <cstdint>
#include <memory>
#include <string>

struct sqlite3;
struct sqlite3_stmt;

namespace kelo::tool {

struct FinalizeStatement {
    void operator()(sqlite3_stmt *statement) const;
};
using SqliteStatement = std::unique_ptr<sqlite3_stmt, FinalizeStatement>;

// A connection to one file. Whatever runs on it ends early when one of StopSignals came.
//
// All functions throw DatabaseError, which names the file and the cause, and Interrupted.
class SqliteFile {
public:
    enum class Mode { kRead, kWrite };
    // Opens the existing file at the absolute `path`. A file of which only reading is permitted is opened for
    // reading in both modes.
    SqliteFile(std::string path, Mode mode);

    // How long a statement waits for a locked database; at first ten seconds.
    void SetBusyTimeout(int timeoutMs);

    // Runs any number of statements without values, and drops their rows.
    void Run(const std::string &sql);
    // The same with one value for ?1.
    void Run(const std::string &sql, const std::string &value);
    SqliteStatement Prepare(const std::string &sql);
    // Returns whether there is a row.
    bool Step(sqlite3_stmt *statement);
    // The first column of the first row; 0 and "" without one.
    int64_t Number(const std::string &sql);
    int64_t Number(const std::string &sql, const std::string &value);
    std::string Text(const std::string &sql);
    bool IsInWalMode();

    sqlite3 *Get() const { return db_.get(); }
    const std::string &Path() const { return path_; }
    // Throws for SQLite's result `status`, with the words of the last error.
    [[noreturn]] void Fail(int status);

private:
    struct Close {
        void operator()(sqlite3 *db) const;
    };
    std::string path_;
    std::unique_ptr<int> busyTimeoutMs_; // SQLite knows its address
    std::unique_ptr<sqlite3, Close> db_;
};

} // namespace kelo::tool
