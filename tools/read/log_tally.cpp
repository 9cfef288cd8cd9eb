#include "read/log_tally.h"

#include <algorithm>
#include <cstdlib>
#include <string_view>
#include <unordered_map>

#include "base/errors.h"
#include "keloplatform/failure.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

constexpr size_t kUnknownSeverity = 8;

size_t SeverityOf(std::string_view word) {
    size_t index = 0;
    while (index < kUnknownSeverity && word != g_MappingSyslogPrior[index])
        ++index;
    return index;
}

std::string SelectionOf(const LogTable &table, const Conditions &conditions) {
    std::string clause;
    if (LogSearchClauseGet(conditions, clause) != 0)
        throw DatabaseError(DescribeDatabaseProblem(table));
    return table.name + (clause.empty() ? "" : " WHERE " + clause);
}

// Passes the first value and the severity of each selected record to `take`.
template <typename Take>
void ForEachRecord(const LogTable &table, const Conditions &conditions, const std::string &column,
                   Take take) {
    const bool hasSeverity = table.kind != TableKind::Transfer;
    const ReadOnlyQuery database(table);
    try {
        database.ForEach(column + (hasSeverity ? ", llevel" : ""), SelectionOf(table, conditions),
                         [&](const ReadOnlyQuery::Values &row) {
                             take(row, hasSeverity ? SeverityOf(row.Text(1)) : kUnknownSeverity);
                         });
    } catch (const SqliteError &) {
        throw DatabaseError(DescribeDatabaseProblem(table, false, *KELOFailureGet()));
    }
}

void Count(SeverityCounts &counts, size_t severity) {
    ++counts.total;
    ++counts.severities[severity];
}

// The number of the span; `time` may be before `origin`.
int64_t SpanOf(int64_t time, int64_t origin, int64_t span) {
    const int64_t into = time - origin;
    return into / span - (into % span < 0 ? 1 : 0);
}

} // namespace

void SeverityCounts::Add(const SeverityCounts &other) {
    total += other.total;
    for (size_t i = 0; i < severities.size(); ++i)
        severities[i] += other.severities[i];
}

const char *SeverityKey(size_t index) {
    return index < kUnknownSeverity ? g_MappingSyslogPrior[index] : "unknown";
}

TimeTally TallyByTime(const LogTable &table, const Conditions &conditions, int64_t origin, int64_t span) {
    TimeTally tally;
    int64_t lastSpan = 0;
    SeverityCounts *last = nullptr; // of the record before, as most follow one of the same span
    ForEachRecord(table, conditions, "utcsec", [&](const ReadOnlyQuery::Values &row, size_t severity) {
        const std::optional<int64_t> time = row.Number(0);
        Count(tally.total, severity);
        if (!time || *time < -kFarthestTime || *time > kFarthestTime)
            return Count(tally.untimed, severity);
        const int64_t number = SpanOf(*time, origin, span);
        if (last == nullptr || number != lastSpan)
            last = &tally.spans[number];
        lastSpan = number;
        Count(*last, severity);
    });
    return tally;
}

ValueTally TallyByColumn(const LogTable &table, const Conditions &conditions, const std::string &column) {
    struct Hash : std::hash<std::string_view> {
        using is_transparent = void;
    };
    std::unordered_map<std::string, SeverityCounts, Hash, std::equal_to<>> values;
    ValueTally tally;
    ForEachRecord(table, conditions, column, [&](const ReadOnlyQuery::Values &row, size_t severity) {
        const std::string_view value = row.Text(0);
        auto found = values.find(value);
        if (found == values.end())
            found = values.emplace(value, SeverityCounts()).first;
        Count(found->second, severity);
        Count(tally.total, severity);
    });
    tally.values = {std::make_move_iterator(values.begin()), std::make_move_iterator(values.end())};
    return tally;
}

uint64_t CountUpTo(const LogTable &table, const Conditions &conditions, uint64_t limit) {
    // A range of ids after the other, each larger than the one before: a count that stops early has read
    // little, and each statement may use an index for keywords.
    constexpr uint64_t kFirstIds = 100'000;
    constexpr uint64_t kMostIds = uint64_t{1} << 60;
    const LogReader everything(table, {});
    uint64_t count = 0;
    uint64_t ids = kFirstIds;
    const ReadOnlyQuery database(table);
    for (uint64_t last = everything.IdFromNewest(0); last != 0;) {
        const IdRange range{last >= ids ? last - ids + 1 : 1, last};
        Conditions inRange = conditions;
        AddRange(inRange, range);
        try {
            const auto row =
                database.FirstRow("SELECT COUNT(*) FROM " + SelectionOf(table, inRange), {"COUNT(*)"});
            count += row ? std::strtoull(row->front().c_str(), nullptr, 10) : 0;
        } catch (const SqliteError &) {
            throw DatabaseError(DescribeDatabaseProblem(table, false, *KELOFailureGet()));
        }
        if (count > limit)
            return limit + 1;
        last = range.first == 1 ? 0 : everything.LastId({1, range.first - 1});
        ids = std::min(2 * ids, kMostIds);
    }
    return count;
}

} // namespace kelo::tool
