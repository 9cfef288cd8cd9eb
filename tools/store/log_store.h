#pragma once

// Storing records into table "logs" of a log database.

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "base/errors.h"
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

// What SQLite said of a database that cannot be used.
struct StoreError : DatabaseError {
    StoreError(const std::string &text, int code, int systemError)
        : DatabaseError(text), code(code), systemError(systemError) {}
    int code;        // SQLite's primary result code
    int systemError; // errno of the file operation that failed, else 0
};

struct LogStoreOptions {
    int busyTimeoutMs = 10'000; // how long to wait for another writer
    // Without it a commit is on the disk only with the next checkpoint: after a loss of power the last ones
    // may be missing, and the database is sound.
    bool mustSyncCommits = true;
};

// An open log database, used by one thread at a time. Batches are transactions: after a failure, a kill or a
// loss of power the database holds whole batches, each with the progress that belongs to it.
class LogStore {
public:
    // Opens the database at `path`, which is created from the shipped schema, in WAL mode, when it is
    // missing; it appears under its name only when it is complete. A database without any table gets the
    // schema too. All functions throw StoreError, or another DatabaseError.
    explicit LogStore(const std::string &path, const LogStoreOptions &options = {});
    ~LogStore();
    LogStore(const LogStore &) = delete;
    LogStore &operator=(const LogStore &) = delete;

    // The progress that was last stored for a source.
    std::optional<StoreProgress> ProgressGet(const std::string &source);

    // Stores `logs`, whose ids SQLite chooses, in one transaction: all or, when it throws, none.
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs);

    // The same, and `progress` in the same transaction.
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs, const StoreProgress &progress);

    // Whether the file was removed or renamed since it was opened. What is stored no longer is where it is
    // looked for then.
    bool HasMoved();

    const std::string &Path() const { return path_; }

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
    void FillEmpty();
    void Run(const char *sql);
    Statement Prepare(const char *sql);
    void StepToEnd(sqlite3_stmt *statement);
    void InsertLog(const _SYSLOG_LOG_DATA_tag &log);
    template <typename Work>
    void InTransaction(Work work);
    void PrepareProgress();
    void SaveProgress(const StoreProgress &progress);
    [[noreturn]] void Fail();

    LogStoreOptions options_;
    std::string path_; // absolute
    std::string file_; // what is open: `path_`, or its forerunner while it is created
    std::unique_ptr<sqlite3, CloseDatabase> db_;
    Statement insertLog_;
    Statement saveProgress_; // made when it is needed
};

} // namespace kelo::tool
