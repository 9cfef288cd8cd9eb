#pragma once

// Storing records into table "logs" of a log database.

#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>

#include "base/sqlite.h"
#include "kelosyslog/records.h"
#include "store/record_table.h"

namespace kelo::tool {

// How far a source of records has been stored.
struct StoreProgress {
    std::string source;  // its name: an absolute path, "-" for standard input
    std::string head;    // its first bytes, which distinguish another content of the same name
    uint64_t offset = 0; // bytes whose records are stored: whole lines
    uint64_t lines = 0;  // lines within them
    bool operator==(const StoreProgress &) const = default;
};

struct LogStoreOptions {
    int busyTimeoutMs = 10'000; // how long to wait for another writer
    // Without it a commit is on the disk only with the next checkpoint: after a loss of power the last ones
    // may be missing, and the database is intact.
    bool mustSyncCommits = true;
};

// An open log database, used by one thread at a time. Batches are transactions: after a failure, a kill or a
// loss of power the database has whole batches, each with its progress.
class LogStore {
public:
    // Opens the database at `path`, which is created from the shipped schema, in WAL mode, when it is
    // missing; it appears under its name only when it is complete, but where a database that was moved has
    // left files under its names. A database without any table gets the schema too. All functions throw
    // SqliteError.
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

    // The same, and what `alongside` writes, in the same transaction.
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs,
               const std::function<void(SqliteConnection &)> &alongside);

    // Whether the file was removed or renamed since it was opened. Records that are stored then are not found
    // at the path.
    bool HasMoved() const { return db_.HasMoved(); }

    const std::string &Path() const { return path_; }

private:
    void FillEmpty();
    void InsertLogs(std::span<const _SYSLOG_LOG_DATA_tag> logs);
    void PrepareProgress();
    void SaveProgress(const StoreProgress &progress);

    std::string path_; // absolute
    SqliteConnection db_;
    RecordTable batch_;
    std::optional<SqliteStatement> insertLogs_;
    std::optional<SqliteStatement> saveProgress_; // made when it is needed
};

} // namespace kelo::tool
