#include "read/log_tally.h"

#include <algorithm>
#include <cstdlib>
#include <functional>
#include <limits>
#include <string_view>
#include <unordered_map>

#include "base/errors.h"
#include "base/number_text.h"
#include "keloplatform/cluster.h"
#include "keloplatform/failure.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

constexpr size_t kUnknownSeverity = 8;

size_t SeverityOf(std::string_view word) {
    const char first = word.empty() ? '\0' : word.front(); // tells nearly all of them apart
    size_t index = 0;
    while (index < kUnknownSeverity &&
           (first != *g_MappingSyslogPrior[index] || word != g_MappingSyslogPrior[index]))
        ++index;
    return index;
}

std::string SelectionOf(const LogTable &table, const Conditions &conditions) {
    std::string clause;
    if (LogSearchClauseGet(conditions, clause) != 0)
        throw DatabaseError(DescribeDatabaseProblem(table));
    return table.name + (clause.empty() ? "" : " WHERE " + clause);
}

using Row = ReadOnlyQuery::Values;

// Passes these columns of each selected record to `take`.
void ForEachRecord(const LogTable &table, const Conditions &conditions, const std::string &columns,
                   const ReadOnlyQuery::RowHandler &take) {
    const ReadOnlyQuery database(table);
    try {
        database.ForEach(columns, SelectionOf(table, conditions), take);
    } catch (const SqliteError &) {
        throw DatabaseError(DescribeDatabaseProblem(table, false, *KELOFailureGet()));
    }
}

// A cluster groups its records itself. Passes each group by its key, `key` as SQL, and its severity.
struct Group {
    std::string key;
    size_t severity;
    uint64_t count;
};
void ForEachGroup(const LogTable &table, const Conditions &conditions, const std::string &key,
                  const std::function<void(const Group &group)> &take) {
    const std::string sql = "SELECT " + key + " AS value, llevel, COUNT(*) AS count FROM " +
                            SelectionOf(table, conditions) + " GROUP BY 1, 2";
    const ReadOnlyQuery database(table);
    try {
        for (const ReadOnlyQuery::Row &row : database.Rows(sql, {"value", "llevel", "count"}))
            take({row[0], SeverityOf(row[1]), UnsignedNumber(row[2])});
    } catch (const SqliteError &) {
        throw DatabaseError(DescribeDatabaseProblem(table, false, *KELOFailureGet()));
    }
}

bool IsOfCluster(const LogTable &table) {
    return KELODBIsCluster(table.path.c_str()) != 0;
}

// Something for each value, found without a copy of it.
template <typename Counts>
class ByValue {
public:
    Counts &operator[](std::string_view value) {
        const auto found = values_.find(value);
        return found != values_.end() ? found->second : values_.emplace(value, Counts()).first->second;
    }
    auto begin() const { return values_.begin(); }
    auto end() const { return values_.end(); }

private:
    struct Hash : std::hash<std::string_view> {
        using is_transparent = void;
    };
    std::unordered_map<std::string, Counts, Hash, std::equal_to<>> values_;
};

// Columns with a value of its own in most records, which SQLite counts with files for what memory cannot
// hold.
bool HasManyValues(const std::string &column) {
    return column == "id" || column == "utcsec" || column == "msg";
}

std::vector<ValueCount> CountManyValues(const LogTable &table, const Conditions &conditions,
                                        const std::string &column, const ValueOrder &order) {
    constexpr uint64_t kAll = std::numeric_limits<int64_t>::max();
    const std::string sql = "SELECT ifnull(" + column + ", '') AS value, COUNT(*) AS count FROM " +
                            SelectionOf(table, conditions) + " GROUP BY 1 ORDER BY " +
                            (order.isMostFrequentFirst ? "2 DESC, " : "") + "1 LIMIT " +
                            std::to_string(order.limit == 0 ? kAll : order.limit) + " OFFSET " +
                            std::to_string(order.offset);
    std::vector<ValueCount> values;
    const ReadOnlyQuery database(table);
    try {
        for (const ReadOnlyQuery::Row &row : database.Rows(sql, {"value", "count"}))
            values.push_back({row[0], UnsignedNumber(row[1])});
    } catch (const SqliteError &) {
        throw DatabaseError(DescribeDatabaseProblem(table, false, *KELOFailureGet()));
    }
    return values;
}

void Count(SeverityCounts &counts, size_t severity, uint64_t count = 1) {
    counts.total += count;
    counts.severities[severity] += count;
}

// The number of the span; `time` may be before `origin`.
int64_t SpanOf(int64_t time, int64_t origin, int64_t span) {
    const int64_t into = time - origin;
    return into / span - (into % span < 0 ? 1 : 0);
}

// Spans are counted from one before all times, because SQL rounds towards zero.
TimeTally TallyClusterByTime(const LogTable &table, const Conditions &conditions, int64_t origin,
                             int64_t span) {
    TimeTally tally;
    const int64_t before = (kFarthestTime + std::abs(origin)) / span + 1;
    const std::string usable =
        "utcsec >= " + std::to_string(-kFarthestTime) + " AND utcsec <= " + std::to_string(kFarthestTime);
    const auto with = [&](const std::string &condition) {
        Conditions all = conditions;
        all.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, condition, {}});
        return all;
    };
    ForEachGroup(table, with(usable),
                 "(utcsec - (" + std::to_string(origin - before * span) + ")) / " + std::to_string(span),
                 [&](const Group &group) {
                     const int64_t number = SignedNumber(group.key) - before;
                     Count(tally.spans[number], group.severity, group.count);
                     Count(tally.total, group.severity, group.count);
                 });
    ForEachGroup(table, with("NOT (" + usable + ")"), "llevel", [&](const Group &group) {
        Count(tally.untimed, group.severity, group.count);
        Count(tally.total, group.severity, group.count);
    });
    return tally;
}

ValueTally TallyClusterByColumn(const LogTable &table, const Conditions &conditions,
                                const std::string &column) {
    ValueTally tally;
    ForEachGroup(table, conditions, column, [&](const Group &group) {
        Count(tally.values[group.key], group.severity, group.count);
        Count(tally.total, group.severity, group.count);
    });
    return tally;
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
    if (IsOfCluster(table))
        return TallyClusterByTime(table, conditions, origin, span);
    TimeTally tally;
    int64_t lastSpan = 0;
    SeverityCounts *last = nullptr; // of the record before, as most follow one of the same span
    ForEachRecord(table, conditions, "utcsec, llevel", [&](const Row &row) {
        const std::optional<int64_t> time = row.Number(0);
        const size_t severity = SeverityOf(row.Text(1));
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
    if (IsOfCluster(table))
        return TallyClusterByColumn(table, conditions, column);
    ByValue<SeverityCounts> values;
    ValueTally tally;
    const bool hasSeverity = table.kind != TableKind::Transfer;
    ForEachRecord(table, conditions, column + (hasSeverity ? ", llevel" : ""), [&](const Row &row) {
        const size_t severity = hasSeverity ? SeverityOf(row.Text(1)) : kUnknownSeverity;
        Count(values[row.Text(0)], severity);
        Count(tally.total, severity);
    });
    tally.values = {values.begin(), values.end()};
    return tally;
}

std::vector<ValueCount> CountValues(const LogTable &table, const Conditions &conditions,
                                    const std::string &column, const ValueOrder &order) {
    if (HasManyValues(column) || IsOfCluster(table))
        return CountManyValues(table, conditions, column, order);
    ByValue<uint64_t> counts;
    ForEachRecord(table, conditions, column, [&](const Row &row) { ++counts[row.Text(0)]; });
    std::vector<ValueCount> values;
    for (const auto &[value, count] : counts)
        values.push_back({value, count});
    std::sort(values.begin(), values.end(), [&](const ValueCount &a, const ValueCount &b) {
        return order.isMostFrequentFirst && a.count != b.count ? a.count > b.count : a.value < b.value;
    });
    values.erase(values.begin(),
                 values.begin() + static_cast<long>(std::min<uint64_t>(order.offset, values.size())));
    if (order.limit != 0 && order.limit < values.size())
        values.resize(order.limit);
    return values;
}

Conditions NarrowToFew(const LogTable &table, const Conditions &conditions) {
    constexpr uint64_t kFew = 10'000;
    if (IsOfCluster(table))
        return conditions;
    std::string ids;
    const uint64_t count =
        LogReader(table, conditions).ReadPage({kFew}, false, [&](const _SYSLOG_LOG_DATA_tag &log) {
            ids += (ids.empty() ? "" : ",") + std::to_string(log.id);
        });
    if (count == kFew)
        return conditions;
    return {{SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "id IN (" + ids + ")", {}}};
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
            count += row ? UnsignedNumber(row->front()) : 0;
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
