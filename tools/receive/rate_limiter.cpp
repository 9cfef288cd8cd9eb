#include "receive/rate_limiter.h"

#include <utility>

namespace kelo::tool {

void RateLimiter::BeginMinute(int64_t now) {
    if (hasBegun_ && now - begin_ < kMinuteSec)
        return;
    hasBegun_ = true;
    begin_ = now;
    for (const auto &[rule, count] : std::exchange(suppressed_, {}))
        toTell_[rule] += count;
    raised_.clear();
    raisedByAll_ = toTell_.empty() ? 0 : 1;
}

bool RateLimiter::Allow(const std::string &rule, int64_t now) {
    BeginMinute(now);
    uint64_t &raised = raised_[rule];
    if (raised == 0 || (raised < perRule_ && raisedByAll_ < forAll_)) {
        ++raised;
        ++raisedByAll_;
        return true;
    }
    ++suppressed_[rule];
    return false;
}

RateLimiter::Counts RateLimiter::TakeSuppressed(int64_t now) {
    if (!suppressed_.empty())
        BeginMinute(now);
    return std::exchange(toTell_, {});
}

RateLimiter::Counts RateLimiter::Drain() {
    begin_ -= kMinuteSec; // the minute is over
    return TakeSuppressed(begin_ + kMinuteSec);
}

} // namespace kelo::tool
