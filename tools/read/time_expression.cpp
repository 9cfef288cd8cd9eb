#include "read/time_expression.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <ctime>
#include <optional>
#include <string_view>

#include "base/errors.h"

namespace kelo::tool {
namespace {

constexpr int64_t kDaySec = 24 * 60 * 60;
// Far beyond any record, and small enough that no sum of two overflows.
constexpr int64_t kLargestSec = int64_t{1} << 40;

struct Unit {
    std::string_view name;
    int64_t seconds;
};
constexpr std::array<Unit, 25> kUnits = {{
    {"s", 1},
    {"sec", 1},
    {"secs", 1},
    {"second", 1},
    {"seconds", 1},
    {"m", 60},
    {"min", 60},
    {"mins", 60},
    {"minute", 60},
    {"minutes", 60},
    {"h", 3600},
    {"hr", 3600},
    {"hour", 3600},
    {"hours", 3600},
    {"d", kDaySec},
    {"day", kDaySec},
    {"days", kDaySec},
    {"w", 7 * kDaySec},
    {"week", 7 * kDaySec},
    {"weeks", 7 * kDaySec},
    {"month", 2629800},
    {"months", 2629800},
    {"y", 31557600},
    {"year", 31557600},
    {"years", 31557600},
}};

// A cursor over the text; every Take function moves it only when it succeeds.
class Scanner {
public:
    explicit Scanner(std::string_view text) : rest_(text) {}

    bool AtEnd() const { return rest_.empty(); }
    void SkipBlanks() {
        while (!rest_.empty() && rest_.front() == ' ')
            rest_.remove_prefix(1);
    }
    bool Take(std::string_view word) {
        if (!rest_.starts_with(word))
            return false;
        rest_.remove_prefix(word.size());
        return true;
    }
    std::optional<int64_t> TakeNumber(size_t minDigits, size_t maxDigits) {
        const size_t digits = Span("0123456789");
        int64_t number = 0;
        if (digits < minDigits || digits > maxDigits)
            return std::nullopt;
        std::from_chars(rest_.data(), rest_.data() + digits, number);
        rest_.remove_prefix(digits);
        return number;
    }
    std::string_view TakeWord() {
        const std::string_view word = rest_.substr(0, Span("abcdefghijklmnopqrstuvwxyz"));
        rest_.remove_prefix(word.size());
        return word;
    }

private:
    size_t Span(std::string_view set) const {
        const size_t end = rest_.find_first_not_of(set);
        return end == std::string_view::npos ? rest_.size() : end;
    }

    std::string_view rest_;
};

struct Clock {
    int64_t hour = 0;
    int64_t minute = 0;
    int64_t second = 0;
};

std::optional<Clock> TakeClock(Scanner &scanner) {
    Clock clock;
    const std::optional<int64_t> hour = scanner.TakeNumber(1, 2);
    if (!hour || !scanner.Take(":"))
        return std::nullopt;
    const std::optional<int64_t> minute = scanner.TakeNumber(2, 2);
    if (!minute)
        return std::nullopt;
    if (scanner.Take(":")) {
        const std::optional<int64_t> second = scanner.TakeNumber(2, 2);
        if (!second)
            return std::nullopt;
        clock.second = *second;
    }
    clock.hour = *hour;
    clock.minute = *minute;
    return clock.hour < 24 && clock.minute < 60 && clock.second < 60 ? std::optional(clock) : std::nullopt;
}

tm LocalDay(int64_t seconds, int dayOffset) {
    const auto time = static_cast<time_t>(seconds);
    tm day{};
    localtime_r(&time, &day);
    day.tm_mday += dayOffset; // mktime() carries it over the month's end
    return day;
}

std::optional<tm> TakeDate(Scanner &scanner) {
    const std::optional<int64_t> year = scanner.TakeNumber(4, 4);
    const std::string_view separator = scanner.Take("-") ? "-" : "/";
    if (!year || (separator == "/" && !scanner.Take("/")))
        return std::nullopt;
    const std::optional<int64_t> month = scanner.TakeNumber(1, 2);
    if (!month || !scanner.Take(separator))
        return std::nullopt;
    const std::optional<int64_t> day = scanner.TakeNumber(1, 2);
    if (!day || *month < 1 || *month > 12)
        return std::nullopt;
    const bool isLeapYear = (*year % 4 == 0 && *year % 100 != 0) || *year % 400 == 0;
    constexpr int kDays[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    const int days = kDays[*month - 1] + (*month == 2 && isLeapYear ? 1 : 0);
    if (*day < 1 || *day > days)
        return std::nullopt;
    tm date{};
    date.tm_year = static_cast<int>(*year) - 1900;
    date.tm_mon = static_cast<int>(*month) - 1;
    date.tm_mday = static_cast<int>(*day);
    return date;
}

std::optional<tm> TakeDayWord(Scanner &scanner, int64_t now) {
    if (scanner.Take("today"))
        return LocalDay(now, 0);
    if (scanner.Take("yesterday"))
        return LocalDay(now, -1);
    if (scanner.Take("tomorrow"))
        return LocalDay(now, 1);
    return std::nullopt;
}

// The second of a local time. When clocks are set back a time comes twice: the first is meant, or the second
// while the first is still to come. (The C library chooses by what it did last.)
int64_t LocalSecond(tm parts, int64_t now) {
    parts.tm_isdst = -1;
    tm wanted = parts;
    const time_t one = mktime(&wanted); // and normalises the day
    for (const time_t setBack : {-7200, -3600, -1800, 1800, 3600, 7200}) {
        const time_t other = one + setBack;
        tm found{};
        localtime_r(&other, &found);
        if (found.tm_mday == wanted.tm_mday && found.tm_hour == wanted.tm_hour &&
            found.tm_min == wanted.tm_min)
            return std::min(one, other) <= now ? std::min(one, other) : std::max(one, other);
    }
    return one;
}

// A day with or without a time of day, or a time of day alone.
std::optional<Moment> ParseCalendar(std::string_view text, int64_t now) {
    Scanner scanner(text);
    std::optional<tm> day = TakeDayWord(scanner, now);
    if (!day) {
        Scanner attempt = scanner;
        if ((day = TakeDate(attempt)))
            scanner = attempt;
    }
    const bool needsClock = !day;
    if (!day)
        day = LocalDay(now, 0);
    else if (!scanner.Take("T"))
        scanner.SkipBlanks();
    Scanner attempt = scanner;
    const std::optional<Clock> clock = TakeClock(attempt);
    if (clock)
        scanner = attempt;
    else if (needsClock)
        return std::nullopt;
    scanner.SkipBlanks();
    const bool isUtc = scanner.Take("Z") || scanner.Take("UTC");
    if (!scanner.AtEnd())
        return std::nullopt;
    day->tm_hour = static_cast<int>(clock.value_or(Clock{}).hour);
    day->tm_min = static_cast<int>(clock.value_or(Clock{}).minute);
    day->tm_sec = static_cast<int>(clock.value_or(Clock{}).second);
    return Moment{isUtc ? timegm(&*day) : LocalSecond(*day, now), !clock.has_value()};
}

// The number and unit at the front of a text, in seconds.
std::optional<int64_t> TakeSpan(Scanner &scanner) {
    const std::optional<int64_t> number = scanner.TakeNumber(1, 10);
    scanner.SkipBlanks();
    const std::string_view name = scanner.TakeWord();
    int64_t unit = 0;
    for (const Unit &known : kUnits)
        unit = known.name == name ? known.seconds : unit;
    scanner.SkipBlanks();
    return number && unit != 0 && *number <= kLargestSec / unit ? std::optional(*number * unit)
                                                                : std::nullopt;
}

std::optional<Moment> ParseRelative(std::string_view text, int64_t now) {
    Scanner scanner(text);
    const bool isFuture = scanner.Take("+");
    const bool hasSign = isFuture || scanner.Take("-");
    int64_t sum = 0;
    bool isAgo = false;
    for (scanner.SkipBlanks(); !scanner.AtEnd() && !isAgo; isAgo = !hasSign && scanner.Take("ago")) {
        const std::optional<int64_t> span = TakeSpan(scanner);
        if (!span || (sum += *span) > kLargestSec)
            return std::nullopt;
    }
    scanner.SkipBlanks();
    if (sum == 0 || !scanner.AtEnd())
        return std::nullopt;
    return Moment{isFuture ? now + sum : now - sum};
}

std::optional<Moment> ParseEpoch(std::string_view text) {
    Scanner scanner(text);
    const bool isMarked = scanner.Take("@");
    const bool isNegative = isMarked && scanner.Take("-");
    // Fewer digits without the mark are probably a mistyped date.
    const std::optional<int64_t> seconds = scanner.TakeNumber(isMarked ? 1 : 9, 13);
    if (!seconds || !scanner.AtEnd())
        return std::nullopt;
    return Moment{isNegative ? -*seconds : *seconds};
}

} // namespace

Moment ParseTimeExpression(const std::string &option, const std::string &text, int64_t now) {
    if (text == "now")
        return {now};
    if (const std::optional<Moment> moment = ParseEpoch(text))
        return *moment;
    if (const std::optional<Moment> moment = ParseCalendar(text, now))
        return *moment;
    if (const std::optional<Moment> moment = ParseRelative(text, now))
        return *moment;
    throw UsageError(option + ": '" + text +
                     "' is not a time; write for example 2020-01-02, '2020-01-02 10:11', yesterday, 1h, "
                     "'2 days ago' or @1577836800");
}

std::optional<int64_t> ParseTimeSpan(const std::string &text) {
    Scanner scanner(text);
    int64_t sum = 0;
    for (scanner.SkipBlanks(); !scanner.AtEnd();) {
        const std::optional<int64_t> span = TakeSpan(scanner);
        if (!span || (sum += *span) > kLargestSec)
            return std::nullopt;
    }
    return sum > 0 ? std::optional(sum) : std::nullopt;
}

} // namespace kelo::tool
