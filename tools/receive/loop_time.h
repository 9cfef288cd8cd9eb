#pragma once

#include <chrono>
#include <cstdint>

#include "base/event_loop.h"

namespace kelo::tool {

// Times of the receivers' loops, in milliseconds.
inline constexpr int64_t kSecondMs = 1000;
inline constexpr int64_t kBeatMs = 6000;     // between two flushes of the accounting
inline constexpr int64_t kRepairMs = 60'000; // between two looks whether the databases are complete
inline constexpr std::chrono::milliseconds kFinishRetry{200}; // between two attempts to store at the end

// Now, of the steady clock.
inline int64_t NowMs() {
    using std::chrono::milliseconds;
    return std::chrono::duration_cast<milliseconds>(std::chrono::steady_clock::now().time_since_epoch())
        .count();
}

inline void FireAt(EventSource &timer, int64_t timeMs) {
    timer.FireAt(std::chrono::steady_clock::time_point(std::chrono::milliseconds(timeMs)));
}

} // namespace kelo::tool
