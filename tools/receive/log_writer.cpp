#include "receive/log_writer.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <memory>

#include "base/files.h"
#include "keloplatform/kelodb.h"
#include "kelosyslog/dbhandler.h"

namespace kelo::tool {
namespace {

constexpr int64_t kBatchMs = 500;
// SQLite itself waits a second for a lock, at each try.
constexpr SyslogDBWriterOptions kStoreOptions{.busyTimeoutMs = 1000, .mustSyncCommits = false};
constexpr int64_t kRetrySoonMs = 100;
constexpr int64_t kRetryMs = 1000;
constexpr int64_t kRetryDamagedMs = 60'000; // each try notifies the administrator

bool IsForLackOfSpace(const SqliteError &error) {
    return error.code == SQLITE_FULL || error.systemError == ENOSPC || error.systemError == EDQUOT ||
           error.systemError == EFBIG;
}

// The inode of the file with the name; 0 for none.
ino_t InodeOf(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

} // namespace

LogWriter::LogWriter(const std::string &path, DiskSpaceMonitor &volume, size_t batchRows)
    : path_(FollowLinks(path)), volume_(volume), batch_(batchRows) {}

void LogWriter::Take(_SYSLOG_LOG_DATA_tag &log, int64_t now) {
    if (batch_.Size() == 0)
        batchTime_ = now;
    batch_.Take(log);
}

int64_t LogWriter::NextTime() const {
    if (batch_.Size() == 0)
        return INT64_MAX;
    return reason_.empty() ? batchTime_ + kBatchMs : retryTime_;
}

bool LogWriter::Advance(int64_t now, bool isUrgent) {
    if (batch_.Size() == 0)
        return true;
    if (!reason_.empty())
        return now >= retryTime_ && Write(now);
    return (now < NextTime() && !batch_.IsFull() && !isUrgent) || Write(now);
}

bool LogWriter::Write(int64_t now) {
    try {
        Open();
        Store(batch_.Records());
    } catch (const SqliteError &error) {
        Pause(error, now);
        return false;
    }
    stored_ += batch_.Size();
    if (hooks_.onStored)
        hooks_.onStored(batch_.Records());
    batch_.Clear();
    if (!reason_.empty()) {
        syslog(LOG_NOTICE, "storing into %s goes on after %lld s", path_.c_str(),
               static_cast<long long>((now - pauseTime_) / 1000));
        reason_.clear();
        volume_.NoteWritten();
    }
    return true;
}

void LogWriter::Store(std::span<const _SYSLOG_LOG_DATA_tag> logs) {
    if (hooks_.alongside)
        store_->Store(logs, hooks_.alongside);
    else
        store_->Store(logs);
}

bool LogWriter::WriteAlongside() {
    if (!reason_.empty())
        return false;
    try {
        Open();
        Store({});
    } catch (const SqliteError &) {
        store_.reset(); // the next batch says why
        return false;
    }
    return true;
}

// What has left the write-ahead log was synced by a checkpoint.
bool LogWriter::Sync() const {
    const FileHandle log(open((path_ + "-wal").c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
    return log ? fdatasync(log.Get()) == 0 : errno == ENOENT;
}

// The file that has the name of the database now.
void LogWriter::Open() {
    if (store_ && store_->HasMoved()) {
        syslog(LOG_NOTICE, "%s was removed or renamed; storing goes on in what has its name", path_.c_str());
        store_.reset();
    }
    if (store_)
        return;
    store_.emplace(path_, kStoreOptions);
}

void LogWriter::Pause(const SqliteError &error, int64_t now) {
    const bool isLocked = error.code == SQLITE_BUSY || error.code == SQLITE_LOCKED;
    retryTime_ = now + (isLocked ? kRetrySoonMs : kRetryMs);
    if (reason_.empty())
        pauseTime_ = now;
    if (reason_ != error.what())
        syslog(LOG_ERR, "receiving waits, as logs cannot be stored: %s", error.what());
    reason_ = error.what();
    if (IsForLackOfSpace(error))
        volume_.NoteFull();
    if (error.code == SQLITE_CORRUPT)
        retryTime_ = now + PutAside();
    else if (!isLocked)
        store_.reset(); // after any failure the next try starts again
}

// Returns after how many milliseconds to try again.
int64_t LogWriter::PutAside() {
    // Another program may detect the damage first, and then the file with this name is intact. The connection
    // is that of the damaged file if the store's still has the name afterwards.
    const std::unique_ptr<DBConnect_tag, decltype(&KELODBClose)> connection(
        KELODBConnect(nullptr, nullptr, nullptr, path_.c_str()), &KELODBClose);
    const bool isAside = store_ && store_->HasMoved();
    const ino_t damaged = InodeOf(path_);
    store_.reset();
    if (!isAside)
        DBErrorHandle_SQLITE_CORRUPT(connection.get(), path_);
    // A reader may have made an empty file of that name since.
    return !isAside && damaged != 0 && InodeOf(path_) == damaged ? kRetryDamagedMs : kRetrySoonMs;
}

} // namespace kelo::tool
