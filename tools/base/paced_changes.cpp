#include "base/paced_changes.h"

#include <sys/stat.h>

#include <algorithm>
#include <thread>

#include "base/stop_signals.h"

namespace kelo::tool {
namespace {

using std::chrono::milliseconds;

constexpr int kLockTimeoutMs = 30'000;
constexpr int64_t kFirstRowLimit = 2000;
constexpr int64_t kLeastRowLimit = 100;
constexpr int64_t kMostRowLimit = 100'000;
// The time that others wait for one transaction. SQLite's writers try again every 50 ms at this age of a
// lock, so each of them gets the lock in the pause.
constexpr milliseconds kTransactionTime{100};
constexpr milliseconds kPause{60};
constexpr off_t kLargestWal = off_t{32} << 20;
// A checkpoint that waits for readers blocks writers too.
constexpr int kCheckpointTimeoutMs = 200;

off_t SizeOf(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_size : 0;
}

} // namespace

PacedChanges::PacedChanges(SqliteConnection &database) : database_(database), rowLimit_(kFirstRowLimit) {
    database_.SetBusyTimeout(kLockTimeoutMs);
}

uint64_t PacedChanges::Run(const Step &step) {
    StopSignals::Check();
    const auto start = Clock::now();
    const uint64_t count = Change(step);
    if (count > 0)
        std::this_thread::sleep_for(std::max<Clock::duration>(kPause, Clock::now() - start));
    BoundWriteAheadLog();
    return count;
}

uint64_t PacedChanges::Change(const Step &step) {
    SqliteTransaction transaction(database_);
    const auto start = Clock::now();
    const uint64_t count = step(rowLimit_, start + kTransactionTime);
    transaction.Commit();
    const auto time = std::max<Clock::duration>(Clock::now() - start, milliseconds(1));
    rowLimit_ =
        std::clamp(static_cast<int64_t>(rowLimit_ * kTransactionTime / time), kLeastRowLimit, kMostRowLimit);
    return count;
}

// Every commit copies what it can of the log into the file, but only an unused log is restarted.
void PacedChanges::BoundWriteAheadLog() {
    if (SizeOf(database_.Name() + "-wal") <= kLargestWal)
        return;
    // First most of it, without blocking writers.
    database_.Checkpoint(false);
    database_.SetBusyTimeout(kCheckpointTimeoutMs);
    database_.Checkpoint(true);
    database_.SetBusyTimeout(kLockTimeoutMs);
}

} // namespace kelo::tool
