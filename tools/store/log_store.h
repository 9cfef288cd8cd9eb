#pragma once

// Storing records with the progress of their source, with exceptions for failures.

#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>

#include "base/sqlite.h"
#include "kelosyslog/dbwriter.h"

namespace kelo::tool {

// How far a source of records has been stored.
struct StoreProgress {
    std::string source;  // its name: an absolute path, "-" for standard input
    std::string head;    // its first bytes, which distinguish another content of the same name
    uint64_t offset = 0; // bytes whose records are stored: whole lines
    uint64_t lines = 0;  // lines within them
    bool operator==(const StoreProgress &) const = default;
};

// An open log database, used by one thread at a time. Batches are transactions: after a failure, a kill or a
// loss of power the database has whole batches, each with its progress. All functions throw SqliteError.
class LogStore {
public:
    // Opens the database at `path`, or creates it, as SyslogDBWriter does.
    explicit LogStore(const std::string &path, const SyslogDBWriterOptions &options = {});

    // The progress that was last stored for a source.
    std::optional<StoreProgress> ProgressGet(const std::string &source);

    // Stores `logs` in one transaction: all or, when it throws, none.
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs);

    // The same, and `progress` in the same transaction.
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs, const StoreProgress &progress);

    // The same, and what `alongside` writes, in the same transaction.
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs,
               const std::function<void(SqliteConnection &)> &alongside);

    // Whether the file was removed or renamed since it was opened. The next records are stored into what has
    // its path then.
    bool HasMoved() const { return writer_.HasMoved(); }

private:
    void Require(int result) const;

    std::string path_; // absolute
    SyslogDBWriter writer_;
};

} // namespace kelo::tool
