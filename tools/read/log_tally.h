#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "read/log_reader.h"
#include "read/log_table.h"

namespace kelo::tool {

// Numbers of records: in all, and by severity.
struct SeverityCounts {
    uint64_t total = 0;
    // By the number of the severity; last those with any other word, and none, as their severity.
    std::array<uint64_t, 9> severities{};

    void Add(const SeverityCounts &other);
};

// The key of an entry of `severities` in documents: "emerg" to "debug", or "unknown".
const char *SeverityKey(size_t index);

// The counts below are each one statement: it hands every record's key and severity to this program, which
// counts them, because SQLite would sort all records. A cluster counts itself. They throw DatabaseError.

// Counts of spans of time, by the number of the span: span 0 begins at `origin`, in seconds since the epoch,
// and lasts `span` seconds.
struct TimeTally {
    std::map<int64_t, SeverityCounts> spans;
    SeverityCounts untimed; // records without a usable time
    SeverityCounts total;   // of all
};
TimeTally TallyByTime(const LogTable &table, const Conditions &conditions, int64_t origin, int64_t span);

// Counts of the values of a column; a NULL is "". A table without severities gives the totals only.
struct ValueTally {
    std::map<std::string, SeverityCounts> values;
    SeverityCounts total;
};
ValueTally TallyByColumn(const LogTable &table, const Conditions &conditions, const std::string &column);

// A value of a column and the number of its records.
struct ValueCount {
    std::string value;
    uint64_t count = 0;
};
struct ValueOrder {
    bool isMostFrequentFirst = false; // else by value
    uint64_t limit = 0;               // 0 for all
    uint64_t offset = 0;
};
std::vector<ValueCount> CountValues(const LogTable &table, const Conditions &conditions,
                                    const std::string &column, const ValueOrder &order);

// The same selection by its ids if it is small, for conditions with a keyword: the index for keywords serves
// only the reading of whole records, not the counts above. Of a cluster it is left as it is.
Conditions NarrowToFew(const LogTable &table, const Conditions &conditions);

// Times that far from the epoch are no times of records.
constexpr int64_t kFarthestTime = int64_t{1} << 40;

// The number of selected records, or `limit` + 1 if there are more than `limit`: counting ends there.
uint64_t CountUpTo(const LogTable &table, const Conditions &conditions, uint64_t limit);

} // namespace kelo::tool
