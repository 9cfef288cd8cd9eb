#pragma once

#include <atomic>
#include <functional>
#include <limits>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "support/doubles.h"

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
    static void Reset() {
        recorded_.clear();
        sent_.clear();
        FailFrom(1, 0);
    }
    // The same, with the first answers again.
    static void Start() {
        Reset();
        answers = {};
    }

    static const std::vector<PlatformCall> &Recorded() { return recorded_; }
    // The texts of the calls of these functions, in order; by default of SQL statements.
    static std::vector<std::string> Texts(const std::set<std::string> &functions = {"KELODBExecute",
                                                                                    "KELODBSelectLimit"});
    static const std::vector<SentNotification> &Sent() { return sent_; }
    // Connections, results and maps that are not freed yet.
    static int OpenHandles() { return openHandles_; }

    // Makes the `first`-th call from now (1 is the next one) fail without reaching the platform, and `times -
    // 1` more after it.
    static void FailFrom(int first, int times = std::numeric_limits<int>::max()) {
        failing_ = {first, times};
        failedFunction_.clear();
    }
    // The function that failed first since then; "" when none has.
    static std::string FailedFunction() { return failedFunction_; }
    static bool HasFailed() { return !failedFunction_.empty(); }

    // For the doubles: records a call and says whether it has to fail; counts handles.
    static bool MustFail(const char *function, const std::string &text, unsigned int limit = 0,
                         unsigned int offset = 0);
    static void Send(const SentNotification &sent) { sent_.push_back(sent); }
    static void CountHandle(const void *handle, int change);

private:
    static inline std::vector<PlatformCall> recorded_;
    static inline std::vector<SentNotification> sent_;
    static inline NthCall failing_;
    static inline std::string failedFunction_;
    static inline std::atomic<int> openHandles_;
};

} // namespace kelo::test
