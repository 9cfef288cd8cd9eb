#pragma once

// Storing records into table "logs" of a log database.

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "errors.h"
#include "kelosyslog/records.h"

struct sqlite3;
struct sqlite3_stmt;

namespace kelo::tool {

// How far a source of records has been stored.
struct StoreProgress {
    std::string source;  // what names it: an absolute path, "-" for standard input
    std::string head;    // its first bytes, by which another content under the same name is told apart
    uint64_t offset = 0; // bytes whose records are stored: whole lines
    uint64_t lines = 0;  // lines within them
    bool operator==(const StoreProgress &) const = default;
};

// An open log database. Batches are transactions: after a failure, a kill or a loss of power the database
// holds whole batches, each with the progress that belongs to it.
class LogStore {
public:
    // Opens the database at `path`, which is created from the shipped schema, in WAL mode, when it is
    // missing; it appears under its name only when it is complete. Waits up to ten seconds for another
    // writer, then and in Store. Throws DatabaseError.
    explicit LogStore(const std::string &path);
    ~LogStore();
    LogStore(const LogStore &) = delete;
    LogStore &operator=(const LogStore &) = delete;

    // The progress that was last stored for a source. Throws DatabaseError.
    std::optional<StoreProgress> ProgressGet(const std::string &source);

    // Stores `logs`, whose ids SQLite chooses, and `progress` in one transaction. Throws DatabaseError, and
    // then neither is stored.
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs, const StoreProgress &progress);

private:
    struct CloseDatabase {
        void operator()(sqlite3 *db) const;
    };
    struct FinalizeStatement {
        void operator()(sqlite3_stmt *statement) const;
    };
    using Statement = std::unique_ptr<sqlite3_stmt, FinalizeStatement>;

    void Open(int flags);
    void Create();
    void Run(const char *sql);
    Statement Prepare(const char *sql);
    void StepToEnd(sqlite3_stmt *statement);
    void InsertLog(const _SYSLOG_LOG_DATA_tag &log);
    void SaveProgress(const StoreProgress &progress);
    [[noreturn]] void Fail();

    std::string path_; // absolute
    std::string file_; // what is open: `path_`, or its forerunner while it is created
    std::unique_ptr<sqlite3, CloseDatabase> db_;
    Statement insertLog_;
    Statement saveProgress_;
};

} // namespace kelo::tool
