#pragma once

#include <chrono>
#include <cstdint>
#include <functional>

#include "base/sqlite.h"

namespace kelo::tool {

// Changes many rows of a database into which others write: in short transactions of about a tenth of a
// second, with pauses for the other writers. The write-ahead log is emptied when it has grown.
class PacedChanges {
public:
    using Clock = std::chrono::steady_clock;
    // Changes up to `rows` rows, and fewer if `end` is reached before. Returns how many.
    using Step = std::function<uint64_t(int64_t rows, Clock::time_point end)>;

    // Waits up to half a minute for a locked database from now on.
    explicit PacedChanges(SqliteConnection &database);

    // One transaction with one step in it, and the pause. Returns what the step did. Throws Interrupted
    // before it, SqliteError, and what the step throws; then nothing has changed.
    uint64_t Run(const Step &step);

private:
    uint64_t Change(const Step &step);
    void BoundWriteAheadLog();

    SqliteConnection &database_;
    int64_t rowLimit_;
};

} // namespace kelo::tool
