#include "receive/rate_limiter.h"

#include <utility>

namespace kelo::tool {

void RateLimiter::BeginMinute(int64_t now) {
    if (state_.hasBegun && now - state_.begin < kMinuteSec)
        return;
    state_.hasBegun = true;
    state_.begin = now;
    for (const auto &[rule, count] : std::exchange(state_.suppressed, {}))
        state_.toTell[rule] += count;
    state_.raised.clear();
    state_.raisedByAll = state_.toTell.empty() ? 0 : 1;
}

bool RateLimiter::Allow(const std::string &rule, int64_t now) {
    BeginMinute(now);
    uint64_t &raised = state_.raised[rule];
    if (raised == 0 || (raised < perRule_ && state_.raisedByAll < forAll_)) {
        ++raised;
        ++state_.raisedByAll;
        return true;
    }
    ++state_.suppressed[rule];
    return false;
}

RateLimiter::Counts RateLimiter::TakeSuppressed(int64_t now) {
    if (!state_.suppressed.empty())
        BeginMinute(now);
    return std::exchange(state_.toTell, {});
}

RateLimiter::Counts RateLimiter::Drain() {
    state_.begin -= kMinuteSec; // the minute is over
    return TakeSuppressed(state_.begin + kMinuteSec);
}

} // namespace kelo::tool
