#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <utility>

#include "receive/disk_space_monitor.h"
#include "store/log_store.h"
#include "store/record_batch.h"

namespace kelo::tool {

// Stores records into a log database, in batches: one is written when it is large enough or half a second
// old.
//
// If the database cannot be written (locked, on a full disk, without permission), the batch is kept and tried
// again, and the system log gets one message. A damaged database is quarantined as DBHandler does it, and one
// that was removed or renamed is given up; a fresh one replaces it.
//
// Times are milliseconds of any clock that does not go back.
class LogWriter {
public:
    // What happens with each batch.
    struct Hooks {
        // Writes something into the database in the transaction of the batch.
        std::function<void(SqliteConnection &database)> alongside;
        // The batch has been stored.
        std::function<void(std::span<const _SYSLOG_LOG_DATA_tag> logs)> onStored;
    };

    // Opens nothing yet. `volume`, which is notified of a full disk, must outlive the writer.
    LogWriter(const std::string &path, DiskSpaceMonitor &volume, size_t batchRows = RecordBatch::kFullRows);

    // A record to be filled and taken without a copy; see RecordBatch.
    _SYSLOG_LOG_DATA_tag &Next() { return batch_.Next(); }

    // Takes the record, and may leave the content of another in it.
    void Take(_SYSLOG_LOG_DATA_tag &log, int64_t now);

    void HooksSet(Hooks hooks) { hooks_ = std::move(hooks); }

    // Writes the batch when it is time, or immediately if `isUrgent`. Returns false while the database cannot
    // be written: no further records should be taken then.
    bool Advance(int64_t now, bool isUrgent = false);

    // When Advance has something to do next.
    int64_t NextTime() const;

    // Writes only what Hooks::alongside writes. Returns false, without effect, if that is not possible now.
    bool WriteAlongside();

    // Makes durable what was written: commits are not synced one by one. Returns false when that failed.
    bool Sync() const;

    // Closes the database. The next batch is written to the file that has its name then.
    void Reopen() { store_.reset(); }

    std::span<const _SYSLOG_LOG_DATA_tag> Records() const { return batch_.Records(); }
    size_t Waiting() const { return batch_.Size(); }
    bool IsFull() const { return batch_.IsFull(); }
    uint64_t Stored() const { return stored_; }
    // Why the database cannot be written; empty when it can.
    const std::string &Reason() const { return reason_; }
    const std::string &Path() const { return path_; }

private:
    bool Write(int64_t now);
    void Store(std::span<const _SYSLOG_LOG_DATA_tag> logs);
    void Open();
    void Pause(const SqliteError &error, int64_t now);
    int64_t PutAside();

    std::string path_; // absolute
    DiskSpaceMonitor &volume_;
    Hooks hooks_;
    std::optional<LogStore> store_;
    RecordBatch batch_;
    int64_t batchTime_ = 0; // of the batch's first record
    uint64_t stored_ = 0;
    std::string reason_;
    int64_t retryTime_ = 0;
    int64_t pauseTime_ = 0; // when it could be written last
};

} // namespace kelo::tool
