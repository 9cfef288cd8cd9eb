#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

namespace kelo::test {

// One call of the notification service.
struct SentNotification {
    std::string tag;
    std::string textsDir;
    std::string filterFile;
    std::map<std::string, std::string> values;
    bool operator==(const SentNotification &) const = default;
};

// Watches the platform functions that notifications need, in addition to PlatformCalls and on the same count
// of calls that can fail. Part of the program that lists notify_calls.cpp among its sources.
class NotifyCalls {
public:
    // Forgets what was sent; the notification service answers 0 without being reached.
    static void Reset();

    // What the notification service answers from now on; nothing: the platform's own service is reached.
    static void AnswerWith(std::optional<int> result);
    static const std::vector<SentNotification> &Sent();

    // Maps that are not freed yet.
    static int OpenHandles();
};

} // namespace kelo::test
