#pragma once

#include <cstdint>

namespace kelo::tool {

// Keeps a flood of matches from raising a flood of notifications.
//
// A minute begins with a match. In it so many matches raise a notification, the rest is counted; the first
// notification of the next minute tells how many. Times are seconds of any clock that does not go back.
class RateLimiter {
public:
    // `perMinute` is at least 1.
    explicit RateLimiter(uint64_t perMinute) : perMinute_(perMinute) {}

    // Whether a match at `now` raises a notification. When not it is counted.
    bool Allow(int64_t now);

    // The matches counted in a minute that is over at `now`; 0 when there is nothing to tell. Who asks tells
    // them, in one notification, which has its place in the new minute.
    uint64_t TakeSuppressed(int64_t now);

    // Whether there are matches that were counted and not told yet.
    bool HasSuppressed() const { return suppressed_ + toTell_ > 0; }

    // All of them.
    uint64_t Drain();

private:
    void BeginMinute(int64_t now);

    static constexpr int64_t kMinuteSec = 60;

    uint64_t perMinute_;
    bool hasBegun_ = false;
    int64_t begin_ = 0;
    uint64_t raised_ = 0;     // in the minute
    uint64_t suppressed_ = 0; // in the minute
    uint64_t toTell_ = 0;     // of the minutes before
};

} // namespace kelo::tool
