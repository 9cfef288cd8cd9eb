#pragma once

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

    static const std::vector<PlatformCall> &Recorded();
    // The SQL texts of KELODBExecute and KELODBSelectLimit, in order.
    static std::vector<std::string> Statements();
    // How many calls that can fail were made since the reset.
    static int Count();

    // Makes the `first`-th call from now (1 is the next one) fail without reaching the platform, and `times -
    // 1` more after it.
    static void FailFrom(int first, int times = std::numeric_limits<int>::max());
    // Whether a failure has been injected since FailFrom.
    static bool HasFailed();
    // The function that failed first; "" when none has.
    static std::string FailedFunction();

    static int OpenConnections();
    static int OpenResults();

    // For the doubles of other platform functions: records a call and tells whether it has to fail.
    static bool MustFail(const char *function, const char *text);
};

} // namespace kelo::test
