#include "archive/removal.h"

#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <thread>

#include "archive/open_options.h"
#include "base/errors.h"
#include "base/stop_signals.h"

namespace kelo::tool {
namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr int kLockTimeoutMs = 30'000;
constexpr int64_t kFirstRowLimit = 10'000;
constexpr int64_t kLeastRowLimit = 100;
constexpr int64_t kMostRowLimit = 100'000;
// The time that others wait for one transaction. SQLite's writers try again every 50 ms at this age of a
// lock, so each of them gets the lock in the pause.
constexpr milliseconds kTransactionTime{100};
constexpr milliseconds kPause{60};
constexpr int kRowsPerLook = 100;
constexpr off_t kLargestWal = off_t{32} << 20;
// A checkpoint that waits for readers blocks writers too.
constexpr int kCheckpointTimeoutMs = 200;

constexpr const char *kRows = "SELECT id, utcsec, host, prog, msg FROM logs WHERE id >= ?1 ORDER BY id";
constexpr const char *kRemove =
    "DELETE FROM logs WHERE id = ?1 AND utcsec IS ?2 AND host IS ?3 AND prog IS ?4 AND msg IS ?5";
constexpr int kColumns = 5;

off_t SizeOf(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_size : 0;
}

} // namespace

Removal::Removal(const std::string &source, const std::string &archive)
    : source_(source, kToWrite), archive_(archive, kToRead), rows_(archive_, kRows),
      remove_(source_, kRemove), rowLimit_(kFirstRowLimit) {
    source_.SetBusyTimeout(kLockTimeoutMs);
}

void Removal::Run() {
    try {
        rows_.Bind(1, source_.Number("SELECT min(id) FROM logs"));
        hasRow_ = rows_.Step();
        while (hasRow_) {
            StopSignals::Check();
            const auto start = steady_clock::now();
            if (RemoveSome())
                std::this_thread::sleep_for(
                    std::max<steady_clock::duration>(kPause, steady_clock::now() - start));
            BoundWriteAheadLog();
        }
    } catch (const DatabaseError &error) {
        throw DatabaseError(std::string(error.what()) + "; " + std::to_string(removed_) +
                            " archived logs were removed before, the others are still there");
    }
}

// One transaction. Returns whether it removed anything.
bool Removal::RemoveSome() {
    SqliteTransaction transaction(source_);
    const auto start = steady_clock::now();
    const uint64_t count = RemoveRows();
    transaction.Commit();
    removed_ += count;
    const auto time = std::max<steady_clock::duration>(steady_clock::now() - start, milliseconds(1));
    rowLimit_ =
        std::clamp(static_cast<int64_t>(rowLimit_ * kTransactionTime / time), kLeastRowLimit, kMostRowLimit);
    return count > 0;
}

uint64_t Removal::RemoveRows() {
    const auto end = steady_clock::now() + kTransactionTime;
    uint64_t count = 0;
    for (int64_t row = 0; hasRow_ && row < rowLimit_; ++row) {
        if (row % kRowsPerLook == 0 && steady_clock::now() >= end)
            break;
        for (int column = 0; column < kColumns; ++column)
            remove_.BindColumn(column + 1, rows_, column);
        remove_.Run();
        count += source_.Changes();
        hasRow_ = rows_.Step();
    }
    return count;
}

// Every commit copies what it can of the log into the file, but only an unused log is restarted.
void Removal::BoundWriteAheadLog() {
    if (SizeOf(source_.Name() + "-wal") <= kLargestWal)
        return;
    // First most of it, without blocking writers.
    source_.Checkpoint(false);
    source_.SetBusyTimeout(kCheckpointTimeoutMs);
    source_.Checkpoint(true);
    source_.SetBusyTimeout(kLockTimeoutMs);
}

} // namespace kelo::tool
