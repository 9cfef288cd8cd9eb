#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <list>

#include "kelosyslog/dbreader.h"
#include "kelosyslog/dbutil.h"
#include "read/log_table.h"

namespace kelo::tool {

using Conditions = std::list<_SYSLOG_SQL_COND_tag>;
// Takes a record while the database is open for reading: it neither prints nor waits.
using LogHandler = std::function<void(const _SYSLOG_LOG_DATA_tag &)>;
// Told that the records so far are complete and the database is closed: the place to print them.
using ChunkHandler = std::function<void()>;

// Row ids, both ends included.
struct IdRange {
    uint64_t first = 1;
    uint64_t last = std::numeric_limits<int64_t>::max();
};

// A page of the logs with an id in `range`, counted from the newest or the oldest of them: `limit` logs (0
// for all) after skipping `offset`. Both, and their sum, are below 2^32.
struct Page {
    uint64_t limit = 0;
    uint64_t offset = 0;
    IdRange range = {};
    bool fromOldest = false;
};

// Reads the logs of one table that meet the conditions; in the order of their ids, which is the order in
// which they arrived.
//
// Pages and counts are exact also after deletions. (The library answers an unfiltered page or count from the
// largest id alone, so every statement here carries a filter of its own.) Long scans go through ranges of
// ids, one statement each, because the library hands out rows only once the result of a statement is
// complete: so memory stays flat, no statement keeps a snapshot of the database for long, and none sorts more
// than its range whichever index SQLite chooses. The ranges grow while they hold few rows, so that ids may be
// far apart.
//
// No database is open while a ChunkHandler runs: a reader that prints slowly does not prevent others from
// removing the file or emptying its write-ahead log.
//
// Every function throws DatabaseError when the database cannot be read, and lets the exceptions of a handler
// pass.
class LogReader {
public:
    LogReader(LogTable table, Conditions conditions);

    const LogTable &Table() const { return table_; }
    const Conditions &Selected() const { return conditions_; }

    // The id of the `index`-th newest selected log (0 is the newest); 0 when there are not that many.
    uint64_t IdFromNewest(uint64_t index) const { return IdAt({1, index}); }
    // The smallest selected id in `range`; 0 when there is none.
    uint64_t FirstId(const IdRange &range) const { return EndId(range, true); }
    // And the largest.
    uint64_t LastId(const IdRange &range) const { return EndId(range, false); }

    // Hands the logs with an id in `range` to `handle`, oldest first or newest first, up to `limit` (0 for
    // all), and calls `chunkDone` after each statement. Returns how many.
    uint64_t Scan(
        const IdRange &range, bool oldestFirst, uint64_t limit, const LogHandler &handle,
        const ChunkHandler &chunkDone = [] {}) const;

    // Hands a page to `handle`, oldest first or newest first, and calls `chunkDone` after each statement.
    // Returns how many records it had.
    uint64_t ReadPage(
        const Page &page, bool oldestFirst, const LogHandler &handle,
        const ChunkHandler &chunkDone = [] {}) const;

    // Number of selected logs, in all or in `range`, which must not span more than 2^31 - 1 ids.
    uint64_t Count() const;
    uint64_t CountIn(const IdRange &range) const;

private:
    struct Scanned {
        uint64_t rows = 0;
        uint64_t lastId = 0; // of the last row, 0 for none
    };

    Scanned Select(const IdRange &range, bool oldestFirst, const Page &page, const LogHandler &handle) const;
    uint64_t IdAt(const Page &page) const;
    uint64_t EndId(const IdRange &range, bool isFirst) const;
    uint64_t CountWith(Conditions conditions) const;
    uint64_t CountOnCluster() const;

    LogTable table_;
    Conditions conditions_;
    SyslogDBReader *connection_ = nullptr; // kept for several statements; each has its own without it
};

// Adds the condition that the id lies in `range`.
void AddRange(Conditions &conditions, const IdRange &range);

} // namespace kelo::tool
