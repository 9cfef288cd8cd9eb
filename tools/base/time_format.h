#pragma once

#include <cstdint>
#include <ctime>
#include <string>

namespace kelo::tool {

// Formats times in the time zone of the process (TZ), or in UTC. An object is for one thread.
class TimeFormat {
public:
    explicit TimeFormat(bool inUtc) : inUtc_(inUtc) {}

    // "2020-01-02 10:11:12"
    std::string Plain(int64_t seconds) const;
    // "2020-01-02T10:11:12+01:00"
    std::string Iso(int64_t seconds) const;
    // "Jan 02 10:11:12"
    std::string Short(int64_t seconds) const;

private:
    std::string WholeIso(int64_t seconds) const;
    std::string Format(int64_t seconds, const char *format) const;
    bool Break(int64_t seconds, tm &parts) const;

    bool inUtc_;
    mutable int64_t quarter_ = -1; // the beginning of the quarter of an hour that was formatted last
    mutable std::string quarterText_;
};

} // namespace kelo::tool
