#pragma once

#include <utility>

namespace kelo::test {

// While one lives (one at a time), a connection that is made waits for a lock only until its handler was
// asked twice. What the test ground connects by itself waits as ever.
class ShortLockWaits {
public:
    using Handler = int (*)(void *, int);

    ShortLockWaits() { isShort_ = true; }
    ~ShortLockWaits() { isShort_ = false; }
    ShortLockWaits(const ShortLockWaits &) = delete;
    ShortLockWaits &operator=(const ShortLockWaits &) = delete;

    // How often a connection gave up waiting since the last call of this function.
    int TakeCount() { return std::exchange(givenUp_, 0); }
    // Whether the handler that was installed last still waits when it is asked for this time.
    bool WaitsAtCall(int number) const { return installed_ != nullptr && installed_(nullptr, number) != 0; }

    // For the double of sqlite3_busy_handler: what to install in the handler's place.
    static Handler Replaced(Handler handler);

private:
    static inline bool isShort_ = false;
    static inline Handler installed_ = nullptr;
    static inline int givenUp_ = 0;
};

} // namespace kelo::test
