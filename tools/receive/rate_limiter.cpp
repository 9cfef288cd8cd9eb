#include "receive/rate_limiter.h"

#include <utility>

namespace kelo::tool {

void RateLimiter::BeginMinute(int64_t now) {
    if (hasBegun_ && now - begin_ < kMinuteSec)
        return;
    hasBegun_ = true;
    begin_ = now;
    toTell_ += std::exchange(suppressed_, 0);
    raised_ = toTell_ > 0 ? 1 : 0;
}

bool RateLimiter::Allow(int64_t now) {
    BeginMinute(now);
    if (raised_ < perMinute_) {
        ++raised_;
        return true;
    }
    ++suppressed_;
    return false;
}

uint64_t RateLimiter::TakeSuppressed(int64_t now) {
    if (suppressed_ > 0)
        BeginMinute(now);
    return std::exchange(toTell_, 0);
}

uint64_t RateLimiter::Drain() {
    return std::exchange(toTell_, 0) + std::exchange(suppressed_, 0);
}

} // namespace kelo::tool
