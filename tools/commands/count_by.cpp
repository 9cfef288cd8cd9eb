#include "commands/count_by.h"

#include <algorithm>

#include "base/errors.h"
#include "base/json.h"
#include "base/time_format.h"
#include "cli/exit_status.h"
#include "print/statistics_table.h"
#include "read/log_tally.h"
#include "read/time_buckets.h"
#include "read/time_expression.h"

namespace kelo::tool {
namespace {

constexpr uint64_t kMostBuckets = 10'000;

// A column to count by, by its name on the command line.
struct CountedColumn {
    const char *name;
    std::string_view column;
};
constexpr std::string_view kSeverity = "llevel";
constexpr std::string_view kFacility = "fac";
constexpr CountedColumn kColumns[] = {
    {"severity", kSeverity}, {"host", "host"}, {"program", "prog"}, {"facility", kFacility}};

// What is printed: a row for each time or value.
struct Answer {
    const char *name;          // of the first column
    bool hasSeverities = true; // the counts are split
    SeverityCounts total = {};
    std::string head = {}; // the members before "count" in a document, ...
    std::string tail = {}; // ... and behind it
    struct Row {
        std::string text;   // of the first column
        std::string number; // the same in a document if it is a number there
        SeverityCounts counts;
    };
    std::vector<Row> rows = {};
};

std::string SeveritiesOf(const SeverityCounts &counts) {
    std::string out;
    JsonObject object(out);
    for (size_t i = 0; i < counts.severities.size(); ++i) {
        if (counts.severities[i] > 0)
            object.AddJson(SeverityKey(i), std::to_string(counts.severities[i]));
    }
    object.End();
    return out;
}

// One object; a row on each line.
std::string Document(const Answer &answer) {
    std::string out = "{" + answer.head + ",\"count\":" + std::to_string(answer.total.total) + answer.tail +
                      ",\"buckets\":";
    JsonLines lines(true);
    lines.Begin(out);
    for (const Answer::Row &row : answer.rows) {
        lines.BeginItem(out);
        JsonObject object(out);
        if (row.number.empty())
            object.Add(answer.name, row.text);
        else
            object.AddJson(answer.name, row.number);
        object.AddJson("count", std::to_string(row.counts.total));
        if (answer.hasSeverities)
            object.AddJson("severities", SeveritiesOf(row.counts));
        object.End();
        lines.EndItem(out);
    }
    lines.End(out);
    out.pop_back();
    return out + "}\n";
}

// As text it has a column for each severity that occurs, else one for each.
std::string Table(const Answer &answer, OutputFormat format) {
    std::vector<StatisticsColumn> columns = {{answer.name, false}, {"count", true}};
    std::vector<size_t> severities;
    for (size_t i = 0; answer.hasSeverities && i < answer.total.severities.size(); ++i) {
        if (format == OutputFormat::Text && answer.total.severities[i] == 0)
            continue;
        severities.push_back(i);
        columns.push_back({SeverityKey(i), true});
    }
    StatisticsTable table(columns);
    for (const Answer::Row &row : answer.rows) {
        std::vector<std::string> cells = {row.text, std::to_string(row.counts.total)};
        for (const size_t i : severities)
            cells.push_back(std::to_string(row.counts.severities[i]));
        table.Add(cells);
    }
    return table.Write(format, true);
}

BucketPeriod PeriodOf(const LogFilter &filter, int64_t now) {
    BucketPeriod period{std::nullopt, LastSecond(filter, now)};
    if (!filter.since.empty())
        period.since = ParseTimeExpression("--since", filter.since, now).seconds;
    return period;
}

Answer AnswerByTime(const TimeBuckets &counts, OutputFormat format) {
    Answer answer{.name = "time", .total = counts.total};
    answer.head = "\"span\":" + std::to_string(counts.span) +
                  ",\"first\":" + (counts.buckets.empty() ? "null" : std::to_string(counts.first));
    answer.tail = ",\"untimed\":" + std::to_string(counts.untimed.total);
    const TimeFormat time(false);
    for (size_t i = 0; i < counts.buckets.size(); ++i) {
        const int64_t begin = counts.BeginOf(i);
        answer.rows.push_back({format == OutputFormat::Text ? time.Plain(begin) : time.Iso(begin),
                               std::to_string(begin), counts.buckets[i]});
    }
    return answer;
}

// The most frequent first.
Answer AnswerByColumn(const CountedColumn &column, const LogTable &table, const Conditions &conditions) {
    const ValueTally tally = TallyByColumn(table, conditions, std::string(column.column));
    const bool hasSeverities = table.kind != TableKind::Transfer && column.column != kSeverity;
    Answer answer{.name = "value", .hasSeverities = hasSeverities, .total = tally.total};
    answer.head = std::string("\"by\":\"") + column.name + "\"";
    for (const auto &[value, counts] : tally.values)
        answer.rows.push_back({value, "", counts});
    std::stable_sort(answer.rows.begin(), answer.rows.end(), [](const Answer::Row &a, const Answer::Row &b) {
        return a.counts.total > b.counts.total;
    });
    return answer;
}

const CountedColumn *FindColumn(const std::string &name) {
    for (const CountedColumn &column : kColumns) {
        if (name == column.name)
            return &column;
    }
    return nullptr;
}

void RequireColumn(const CountedColumn &column, const LogTable &table) {
    const bool isMissing = (column.column == kFacility && table.kind != TableKind::Logs) ||
                           (column.column == kSeverity && table.kind == TableKind::Transfer);
    if (isMissing)
        throw UsageError("--by: table " + table.name + " has no column '" + std::string(column.column) + "'");
}

BucketSize SizeOf(const CountByOptions &options) {
    if (!options.buckets.empty())
        return {0, ParseNumber("--buckets", options.buckets, 1, kMostBuckets)};
    const std::optional<int64_t> span = ParseTimeSpan(options.by);
    if (!span)
        throw UsageError("--by: '" + options.by +
                         "' is none of severity, host, program, facility, and no span of time such as 60s, "
                         "15min, 1h or 1d");
    return {*span, 0};
}

Answer Ask(const LogTable &table, const Conditions &conditions, const BucketPeriod &period,
           const CountByOptions &options, OutputFormat format) {
    if (const CountedColumn *column = FindColumn(options.by)) {
        RequireColumn(*column, table);
        return AnswerByColumn(*column, table, conditions);
    }
    const BucketSize size = SizeOf(options);
    if (table.kind != TableKind::Logs)
        throw UsageError("--by: table " + table.name + " has no column 'utcsec'");
    return AnswerByTime(CountByTime(table, conditions, period, size), format);
}

} // namespace

std::vector<std::string> CountedColumnNames() {
    std::vector<std::string> names;
    for (const CountedColumn &column : kColumns)
        names.emplace_back(column.name);
    return names;
}

int CountBy(const LogTable &table, const Conditions &conditions, const LogFilter &filter, int64_t now,
            const CountByOptions &options, OutputFormat format) {
    if (!options.by.empty() && !options.buckets.empty())
        throw UsageError("--buckets: goes not together with --by");
    const Conditions selected = filter.keywords.empty() ? conditions : NarrowToFew(table, conditions);
    const Answer answer = Ask(table, selected, PeriodOf(filter, now), options, format);
    Output output(true);
    output.Write(format == OutputFormat::Json ? Document(answer) : Table(answer, format));
    output.Finish();
    return answer.total.total > 0 ? kExitFound : kExitNothing;
}

} // namespace kelo::tool
