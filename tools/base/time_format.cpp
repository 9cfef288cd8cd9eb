#include "base/time_format.h"

namespace kelo::tool {

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

std::string TimeFormat::Iso(int64_t seconds) const {
    std::string text = Format(seconds, "%Y-%m-%dT%H:%M:%S%z");
    if (text.front() != '@')
        text.insert(text.size() - 2, ":");
    return text;
}

std::string TimeFormat::Short(int64_t seconds) const {
    return Format(seconds, "%b %d %H:%M:%S");
}

} // namespace kelo::tool
