#pragma once

namespace kelo::test {

// While one lives, what this thread allocates is the test ground's own: injected allocation failures spare it
// and leak checks do not count it. The doubles use it, so that only the code under test meets the faults.
class FaultPause {
public:
    FaultPause() { ++depth_; }
    ~FaultPause() { --depth_; }
    FaultPause(const FaultPause &) = delete;
    FaultPause &operator=(const FaultPause &) = delete;

    static bool IsActive() { return depth_ > 0; }

private:
    static inline thread_local int depth_ = 0;
};

} // namespace kelo::test
