#pragma once

// What functions share that replace those of libraries in a test program.

#include <dlfcn.h>

namespace kelo::test {

// Where this thread is while one lives.
template <typename Place>
class Stay {
public:
    Stay() { ++depth_; }
    ~Stay() { --depth_; }
    Stay(const Stay &) = delete;
    Stay &operator=(const Stay &) = delete;

    static bool IsActive() { return depth_ > 0; }

private:
    static inline thread_local int depth_ = 0;
};

// In the test's own code: injected allocation failures spare what it allocates, and leak checks do not count
// it.
using FaultPause = Stay<struct TestCode>;

// The function behind the test program's own one of the same name.
template <auto *Function>
auto Real(const char *name) {
    static const auto real = [name] {
        const FaultPause pause;
        return reinterpret_cast<decltype(Function)>(dlsym(RTLD_NEXT, name));
    }();
    return real;
}

// Chooses the calls that fail: the `first`-th of those to come (1 is the next one) and `times - 1` more.
struct NthCall {
    int first = 0;
    int times = 0; // 0: none
    int count = 0;
    bool hasFailed = false;

    bool MustFail() {
        if (times == 0)
            return false;
        const int past = ++count - first;
        const bool fails = past >= 0 && past < times;
        hasFailed = hasFailed || fails;
        return fails;
    }
};

} // namespace kelo::test
