#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "read/log_table.h"

namespace kelo::tool {

// The categories of a chart.
enum class SeverityClass { Errors, Warnings, Information, Debug };
constexpr size_t kSeverityClasses = 4;
constexpr size_t kSeverities = 8;

// Equal spans of time that begin at round times of the process's time zone.
struct TimeGrid {
    int64_t origin = 0;   // begin of the first span, seconds since the epoch
    int64_t widthSec = 1; // of a span
    size_t count = 0;

    int64_t Begin(size_t span) const { return origin + static_cast<int64_t>(span) * widthSec; }
    // The span that holds `stamp`; none outside the grid.
    std::optional<size_t> Find(int64_t stamp) const;
};

// The grid over [from, to] with about a hundred spans at most.
TimeGrid MakeTimeGrid(int64_t from, int64_t to);

// A period, both ends included, in seconds since the epoch.
struct Period {
    int64_t from = 0;
    int64_t to = 0;
};

// The figures of a table "logs" in a period.
struct LogFigures {
    TimeGrid grid;
    std::vector<std::array<uint64_t, kSeverityClasses>> spans; // by span of the grid
    std::array<uint64_t, kSeverities> severities{};            // by severity
    uint64_t otherSeverities = 0;                              // words that are not a severity
    std::vector<std::pair<std::string, uint64_t>> devices;     // the top ones, most records first
    uint64_t deviceCount = 0;
    uint64_t total = 0;
};

// The period from `since` to `until`, each replaced by the time of the oldest or newest record if it is not
// given; none for an empty table.
std::optional<Period> LogPeriod(const LogTable &table, std::optional<int64_t> since,
                                std::optional<int64_t> until);

// Reads the figures in two statements, which group the rows inside the database: less than a second per
// million rows. `isWhole` says that the period includes every record, which saves a condition. Both functions
// throw DatabaseError.
LogFigures ReadLogFigures(const LogTable &table, const Period &period, bool isWhole, size_t topDevices);

} // namespace kelo::tool
