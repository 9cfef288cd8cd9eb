#pragma once

namespace kelo::test {

// While one lives (one at a time), a connection that is made waits for a lock only until its handler was
// asked twice. What the test ground connects by itself waits as ever.
class ShortLockWaits {
public:
    ShortLockWaits();
    ~ShortLockWaits();
    ShortLockWaits(const ShortLockWaits &) = delete;
    ShortLockWaits &operator=(const ShortLockWaits &) = delete;

    // How often a connection gave up waiting since the last call of this function.
    int TakeCount();
    // Whether the handler that was installed last still waits when it is asked for this time.
    bool WaitsAtCall(int number) const;
};

} // namespace kelo::test
