#include "report/log_figures.h"

#include <algorithm>
#include <ctime>

#include "base/number_text.h"
#include "kelosyslog/records.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

constexpr int64_t kMostSpans = 100;
constexpr int64_t kDaySec = 86400;

int64_t FloorMod(int64_t value, int64_t divisor) {
    return (value % divisor + divisor) % divisor;
}

int64_t UtcOffset(int64_t stamp) {
    const auto time = static_cast<time_t>(stamp);
    tm parts{};
    return localtime_r(&time, &parts) != nullptr ? parts.tm_gmtoff : 0;
}

SeverityClass ClassOf(size_t severity) {
    if (severity <= SYSLOG_PRIO_ERR)
        return SeverityClass::Errors;
    if (severity == SYSLOG_PRIO_WARNING)
        return SeverityClass::Warnings;
    return severity == SYSLOG_PRIO_DEBUG ? SeverityClass::Debug : SeverityClass::Information;
}

// The index of a severity's word; kSeverities for any other text.
size_t SeverityIndex(const std::string &word) {
    size_t index = 0;
    while (index < kSeverities && word != g_MappingSyslogPrior[index])
        ++index;
    return index;
}

void AddSpan(LogFigures &figures, const std::string &severity, int64_t span, uint64_t count) {
    const size_t index = SeverityIndex(severity);
    (index < kSeverities ? figures.severities[index] : figures.otherSeverities) += count;
    figures.total += count;
    if (span >= 0 && span < static_cast<int64_t>(figures.spans.size()))
        figures.spans[static_cast<size_t>(span)][static_cast<size_t>(ClassOf(index))] += count;
}

} // namespace

std::optional<size_t> TimeGrid::Find(int64_t stamp) const {
    const int64_t span = (stamp - origin) / widthSec;
    if (stamp < origin || span >= static_cast<int64_t>(count))
        return std::nullopt;
    return static_cast<size_t>(span);
}

TimeGrid MakeTimeGrid(int64_t from, int64_t to) {
    constexpr std::array<int64_t, 15> kWidths = {1,    5,    10,    30,    60,    300,     600,        900,
                                                 1800, 3600, 10800, 21600, 43200, kDaySec, 7 * kDaySec};
    TimeGrid grid;
    const int64_t least = (to - from) / kMostSpans + 1;
    const auto *width = std::lower_bound(kWidths.begin(), kWidths.end(), least);
    grid.widthSec = width != kWidths.end() ? *width : (least / kDaySec + 1) * kDaySec;
    grid.origin = from - FloorMod(from + UtcOffset(from), grid.widthSec);
    grid.count = static_cast<size_t>((to - grid.origin) / grid.widthSec + 1);
    return grid;
}

std::optional<Period> LogPeriod(const LogTable &table, std::optional<int64_t> since,
                                std::optional<int64_t> until) {
    const auto ends = ReadOnlyQuery(table).FirstRow(
        "SELECT (SELECT min(utcsec) FROM logs) AS first, (SELECT max(utcsec) FROM logs) AS last",
        {"first", "last"});
    if (!ends || ends->front().empty())
        return std::nullopt;
    return Period{since.value_or(SignedNumber(ends->front())), until.value_or(SignedNumber(ends->back()))};
}

LogFigures ReadLogFigures(const LogTable &table, const Period &period, bool isWhole, size_t topDevices) {
    LogFigures figures;
    figures.grid = MakeTimeGrid(period.from, period.to);
    figures.spans.resize(figures.grid.count);
    const std::string which = isWhole ? ""
                                      : " WHERE utcsec BETWEEN " + std::to_string(period.from) + " AND " +
                                            std::to_string(period.to);
    const ReadOnlyQuery database(table);
    const std::string span =
        "(utcsec - (" + std::to_string(figures.grid.origin) + ")) / " + std::to_string(figures.grid.widthSec);
    for (const ReadOnlyQuery::Row &row : database.Rows(
             "SELECT " + span + " AS span, prio, count(*) AS number FROM logs" + which + " GROUP BY 1, 2",
             {"prio", "span", "number"}))
        AddSpan(figures, row[0], SignedNumber(row[1]), UnsignedNumber(row[2]));
    for (const ReadOnlyQuery::Row &row : database.Rows("SELECT host, count(*) AS number FROM logs" + which +
                                                           " GROUP BY host ORDER BY number DESC, host",
                                                       {"host", "number"})) {
        if (figures.deviceCount++ < topDevices)
            figures.devices.emplace_back(row[0], UnsignedNumber(row[1]));
    }
    return figures;
}

} // namespace kelo::tool
