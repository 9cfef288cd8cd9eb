#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <list>

#include "kelosyslog/dbutil.h"
#include "log_source.h"

namespace kelo::tool {

using Conditions = std::list<_SYSLOG_SQL_COND_tag>;
using LogHandler = std::function<void(const _SYSLOG_LOG_DATA_tag &)>;

// Row ids, both ends included.
struct IdRange {
    uint64_t first = 1;
    uint64_t last = std::numeric_limits<int64_t>::max();
};

// A page counted from the newest log: `limit` logs (0 for all) after skipping the `offset` newest. Both, and
// their sum, are below 2^32.
struct Page {
    uint64_t limit = 0;
    uint64_t offset = 0;
};

// Reads the logs of one table that meet the conditions; in the order of their ids, which is the order in
// which they arrived.
//
// Pages and counts are exact also after deletions. (The library answers an unfiltered page or count from the
// largest id alone, so every statement here carries a filter of its own.) Long walks run in chunks, because
// the library hands out rows only once the result of a statement is complete: so memory stays flat and no
// statement keeps a snapshot of the database for long.
//
// Every function throws DatabaseError when the database cannot be read, and lets the exceptions of a handler
// pass.
class LogReader {
public:
    LogReader(LogSource source, Conditions conditions);

    const LogSource &Source() const { return source_; }

    // The id of the `index`-th newest log that is selected (0 is the newest); 0 when there are not that many.
    uint64_t IdFromNewest(uint64_t index) const;
    // The smallest selected id in `range`; 0 when there is none.
    uint64_t FirstId(const IdRange &range) const;

    // Hands the logs with an id in `range` to `handle`, oldest first or newest first, after skipping
    // `page.offset` of them and up to `page.limit`. Returns how many.
    uint64_t Walk(const IdRange &range, bool oldestFirst, const Page &page, const LogHandler &handle) const;

    // Hands a page to `handle`, oldest first. Returns how many logs it had.
    uint64_t WalkPage(const Page &page, const LogHandler &handle) const;

    // Number of selected logs.
    uint64_t Count() const;

private:
    uint64_t Select(Conditions conditions, const IdRange &range, bool oldestFirst,
                    _SYSLOG_SQL_LIMIT_tag limit, const LogHandler &handle) const;
    uint64_t CountIn(const IdRange *range) const;

    LogSource source_;
    Conditions conditions_;
};

} // namespace kelo::tool
