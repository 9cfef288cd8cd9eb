#pragma once

#include <functional>
#include <limits>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace kelo::test {

// One recorded call of a platform function that can fail.
struct PlatformCall {
    std::string function;   // "KELODBExecute"
    std::string text;       // SQL text, path or other leading text argument
    unsigned int limit = 0; // of KELODBSelectLimit
    unsigned int offset = 0;
    bool operator==(const PlatformCall &) const = default;
};

// One call of the notification service.
struct SentNotification {
    std::string tag;
    std::string textsDir;
    std::string filterFile;
    std::map<std::string, std::string> values;
    bool operator==(const SentNotification &) const = default;
};

// What functions answer that act outside of the process; nothing: they are reached.
struct PlatformAnswers {
    std::optional<int> notification = 0;
    std::optional<bool> reload = true;
    std::function<void()> onReload;
};

// Watches the process's calls of the platform functions that can fail, also those from libkelosyslog, and
// makes chosen ones fail. The others reach the platform library. Calls may come from several threads; the
// questions are for when none is under way.
class PlatformCalls {
public:
    static inline PlatformAnswers answers;

    // Forgets what was recorded and sent, and makes nothing fail.
    static void Reset();
    // The same, with the first answers again.
    static void Start();

    static const std::vector<PlatformCall> &Recorded();
    // The texts of the calls of these functions, in order; by default of SQL statements.
    static std::vector<std::string> Texts(const std::set<std::string> &functions = {"KELODBExecute",
                                                                                    "KELODBSelectLimit"});
    static const std::vector<SentNotification> &Sent();
    // Connections, results and maps that are not freed yet.
    static int OpenHandles();

    // Makes the `first`-th call from now (1 is the next one) fail without reaching the platform, and `times -
    // 1` more after it.
    static void FailFrom(int first, int times = std::numeric_limits<int>::max());
    // The function that failed first since then; "" when none has.
    static std::string FailedFunction();
    static bool HasFailed() { return !FailedFunction().empty(); }
};

} // namespace kelo::test
