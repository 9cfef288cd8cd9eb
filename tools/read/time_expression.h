#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace kelo::tool {

// A point in time that a user gave.
struct Moment {
    int64_t seconds = 0;    // since the epoch
    bool isDayOnly = false; // a date or "today" without a time of day; `seconds` is the day's begin
};

// Reads a point in time in the form of a command line; `now` is the present in seconds since the epoch:
//
//     2020-01-02, 2020/01/02               a day's begin in the time zone of the process (TZ)
//     2020-01-02 10:11, 2020-01-02T10:11:12    with a time; "Z" or " UTC" at the end makes it UTC
//     10:11, 10:11:12                      today
//     now; today, yesterday, tomorrow      the words for days also with a time: "yesterday 18:00"
//     1h, -1h, 2 days ago, 1h 30min ago    before now; "+1h" after it. Units: s, m or min, h, d, w, month, y
//     and
//                                          their long forms; a day has 24 hours, a year 365.25 days
//     @1577836800, 1577836800              seconds since the epoch; without '@' at least nine digits
//
// Throws UsageError that names `option` and `text` for anything else, a day that its month does not have
// included.
Moment ParseTimeExpression(const std::string &option, const std::string &text, int64_t now);

// Reads a length of time in the same units ("60s", "15min", "1h 30min", "1d"), in seconds. Nothing for
// anything else, 0 included.
std::optional<int64_t> ParseTimeSpan(const std::string &text);

} // namespace kelo::tool
