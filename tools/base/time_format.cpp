#include "base/time_format.h"

#include <string_view>

namespace kelo::tool {
namespace {

bool StartsQuarter(std::string_view minutesAndSeconds) {
    return minutesAndSeconds.starts_with("00:00") || minutesAndSeconds.starts_with("15:00") ||
           minutesAndSeconds.starts_with("30:00") || minutesAndSeconds.starts_with("45:00");
}

} // namespace

bool TimeFormat::Break(int64_t seconds, tm &parts) const {
    const auto time = static_cast<time_t>(seconds);
    return (inUtc_ ? gmtime_r(&time, &parts) : localtime_r(&time, &parts)) != nullptr;
}

std::string TimeFormat::Format(int64_t seconds, const char *format) const {
    tm parts{};
    char text[64];
    if (!Break(seconds, parts)) // a year that does not fit
        return "@" + std::to_string(seconds);
    return {text, std::strftime(text, sizeof text, format, &parts)};
}

std::string TimeFormat::Plain(int64_t seconds) const {
    return Format(seconds, "%Y-%m-%d %H:%M:%S");
}

std::string TimeFormat::WholeIso(int64_t seconds) const {
    std::string text = Format(seconds, "%Y-%m-%dT%H:%M:%S%z");
    if (text.front() != '@')
        text.insert(text.size() - 2, ":");
    return text;
}

std::string TimeFormat::Iso(int64_t seconds) const {
    constexpr size_t kMinutesAt = 14;
    constexpr size_t kIsoSize = 25;
    constexpr int64_t kQuarterSec = 900;
    constexpr int64_t kModern = 63'072'000; // 1972: no clock is set within a quarter of an hour since
    if (seconds < kModern)
        return WholeIso(seconds);
    if (const int64_t begin = seconds - seconds % kQuarterSec; begin != quarter_) {
        quarterText_ = WholeIso(begin);
        quarter_ = begin;
    }
    std::string text = quarterText_;
    // Not with a year of five digits, and not where the system counts leap seconds.
    if (text.size() != kIsoSize || !StartsQuarter(text.substr(kMinutesAt)))
        return WholeIso(seconds);
    const auto write = [&](size_t at, int64_t number) {
        text[at] = static_cast<char>('0' + number / 10);
        text[at + 1] = static_cast<char>('0' + number % 10);
    };
    write(kMinutesAt,
          (text[kMinutesAt] - '0') * 10 + (text[kMinutesAt + 1] - '0') + seconds % kQuarterSec / 60);
    write(kMinutesAt + 3, seconds % 60);
    return text;
}

std::string TimeFormat::Short(int64_t seconds) const {
    return Format(seconds, "%b %d %H:%M:%S");
}

} // namespace kelo::tool
