#pragma once

#include <atomic>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

namespace kelo::test {

// One recorded call of a platform function that can fail.
struct PlatformCall {
    std::string function;   // "KELODBExecute"
    std::string text;       // SQL text, path or other leading text argument
    unsigned int limit = 0; // of KELODBSelectLimit
    unsigned int offset = 0;
};

// Watches every call of a platform function in the process, also those out of libkelosyslog, and makes chosen
// ones fail. The calls reach the real platform library. Calls may come from several threads; the questions
// are for when none is under way.
class PlatformCalls {
public:
    // Forgets what was recorded and makes nothing fail. Open handles stay counted.
    static void Reset();

    static const std::vector<PlatformCall> &Recorded() { return recorded_; }
    // The SQL texts of KELODBExecute and KELODBSelectLimit, in order.
    static std::vector<std::string> Statements();
    // How many calls that can fail were made since the reset.
    static int Count() { return static_cast<int>(recorded_.size()); }

    // Makes the `first`-th call from now (1 is the next one) fail without reaching the platform, and `times -
    // 1` more after it.
    static void FailFrom(int first, int times = std::numeric_limits<int>::max());
    // Whether a failure has been injected since FailFrom.
    static bool HasFailed() { return !failedFunction_.empty(); }
    // The function that failed first; "" when none has.
    static std::string FailedFunction() { return failedFunction_; }

    static int OpenConnections() { return openConnections_; }
    static int OpenResults() { return openResults_; }

    // For the doubles of platform functions: records a call; whether it must fail.
    static bool MustFail(const char *function, const char *text, unsigned int limit = 0,
                         unsigned int offset = 0);
    // Counts a connection or result that was opened (1) or closed (-1).
    static void CountConnection(int change);
    static void CountResult(int change);

private:
    static inline std::vector<PlatformCall> recorded_;
    static inline int64_t failFirst_ = 0; // counted like Count(); 0 for never
    static inline int failTimes_ = 0;
    static inline std::string failedFunction_;
    static inline std::atomic<int> openConnections_;
    static inline std::atomic<int> openResults_;
};

} // namespace kelo::test
