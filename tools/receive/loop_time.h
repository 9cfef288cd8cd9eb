#pragma once

#include <chrono>
#include <cstdint>

#include "base/event_loop.h"

namespace kelo::tool {

// Times of the receivers, in milliseconds of the steady clock.
inline int64_t NowMs() {
    using std::chrono::milliseconds;
    return std::chrono::duration_cast<milliseconds>(std::chrono::steady_clock::now().time_since_epoch())
        .count();
}

inline void FireAt(EventSource &timer, int64_t timeMs) {
    timer.FireAt(std::chrono::steady_clock::time_point(std::chrono::milliseconds(timeMs)));
}

} // namespace kelo::tool
