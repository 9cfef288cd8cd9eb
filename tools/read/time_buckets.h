#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "read/log_tally.h"

namespace kelo::tool {

// Counts of the selected records over consecutive spans of time, empty ones included.
struct TimeBuckets {
    int64_t span = 1;  // seconds
    int64_t first = 0; // begin of the first bucket, in seconds since the epoch
    std::vector<SeverityCounts> buckets;
    SeverityCounts total; // of all records, those without a usable time included
    SeverityCounts untimed;

    int64_t BeginOf(size_t bucket) const { return first + static_cast<int64_t>(bucket) * span; }
};

// How long a bucket is: `span` seconds or, with 0, as short as `most` buckets allow.
struct BucketSize {
    int64_t span = 0;
    uint64_t most = 0;
};

// The period of the buckets; without an end of it, up to the oldest or the newest selected record.
struct BucketPeriod {
    std::optional<int64_t> since;
    std::optional<int64_t> until; // the last second
};

// Spans that are chosen are 1, 5, 15 and 30 seconds and minutes, 1, 3, 6 and 12 hours, a day, a week and
// twice, four times, ... a week. Buckets begin as on a clock in the time zone of the process, with its offset
// at the begin of the period; weeks begin on Monday. Records outside of the period by their time, after a
// clock was set, widen it. Throws UsageError naming --by for more buckets than a reader could use, and
// DatabaseError.
TimeBuckets CountByTime(const LogTable &table, const Conditions &conditions, const BucketPeriod &period,
                        const BucketSize &size);

} // namespace kelo::tool
