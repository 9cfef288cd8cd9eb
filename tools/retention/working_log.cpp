#include "retention/working_log.h"

#include <algorithm>
#include <limits>

namespace kelo::tool {

WorkingLog::WorkingLog(const std::string &path, SqliteMode mode)
    : database_(path, {.mode = mode, .heedsStopSignals = true, .trustsSchema = false}), changes_(database_) {}

WorkingLog::Room WorkingLog::Measure() {
    const int64_t pageBytes = database_.Number("PRAGMA page_size");
    const int64_t reusable = database_.Number("PRAGMA freelist_count");
    const int64_t used = database_.Number("PRAGMA page_count") - reusable;
    return {static_cast<uint64_t>(used * pageBytes), static_cast<uint64_t>(reusable * pageBytes)};
}

int64_t WorkingLog::Records() {
    return database_.Number("SELECT max(id) - (SELECT min(id) FROM logs) + 1 FROM logs");
}

int64_t WorkingLog::NewestSec() {
    return database_.Number("SELECT utcsec FROM logs ORDER BY id DESC LIMIT 1");
}

int64_t WorkingLog::CountBefore(int64_t sec) {
    return database_.Number("SELECT count(*) FROM logs WHERE utcsec < " + std::to_string(sec));
}

uint64_t WorkingLog::Remove(SqliteStatement &statement, int limitIndex, int64_t most) {
    if (database_.HasMoved()) // what was set aside is evidence
        throw DatabaseError(database_.Name() + ": was replaced meanwhile");
    return changes_.Run([&](int64_t rows, auto) {
        statement.Bind(limitIndex, std::min(rows, most));
        statement.Run();
        return database_.Changes();
    });
}

uint64_t WorkingLog::RemoveBefore(int64_t sec) {
    SqliteStatement statement(database_,
                              "DELETE FROM logs WHERE id IN (SELECT id FROM logs WHERE utcsec < ?1 "
                              "ORDER BY utcsec LIMIT ?2)");
    statement.Bind(1, sec);
    uint64_t removed = 0;
    for (uint64_t count = 1; count > 0; removed += count)
        count = Remove(statement, 2, std::numeric_limits<int64_t>::max());
    return removed;
}

uint64_t WorkingLog::RemoveOldest(const std::function<uint64_t(const Room &)> &excess) {
    SqliteStatement statement(database_,
                              "DELETE FROM logs WHERE id IN (SELECT id FROM logs ORDER BY id LIMIT ?1)");
    uint64_t removed = 0;
    for (uint64_t count = 1; count > 0; removed += count) {
        const Room room = Measure();
        const uint64_t bytes = excess(room);
        if (bytes == 0)
            break;
        // The part of the records that takes these bytes, and a few, as a page goes with its last record.
        const double part =
            static_cast<double>(bytes) / static_cast<double>(std::max<uint64_t>(room.used, 1));
        count = Remove(statement, 1, static_cast<int64_t>(part * static_cast<double>(Records())) + 100);
    }
    return removed;
}

} // namespace kelo::tool
