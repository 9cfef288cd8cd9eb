#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "kelosyslog/notification.h"
#include "receive/rate_limiter.h"

namespace kelo::tool {

// Checks logs against the severity and keyword rules. A match raises a notification and an event, a flood of
// them a bounded number a minute for either kind of rule. A notification or event that fails is only reported
// in the system log, by the library; after an event that failed a minute goes without events.
//
// Times are seconds of any clock that does not go back.
class RuleChecker {
public:
    // Loads the rules. `notifyLimit`: notifications a minute and kind of rule, at least 1.
    explicit RuleChecker(uint64_t notifyLimit);

    void Check(const _SYSLOG_LOG_DATA_tag &log, int64_t now);

    // To be called about once a second, unless idle: tells what was suppressed in a minute that is over.
    void Tick(int64_t now);

    // Whether no matches are left to report.
    bool IsIdle() const { return !severity_.limit.HasSuppressed() && !keyword_.limit.HasSuppressed(); }

    // Tells what is left to tell.
    void Finish();

    // Loads the rules anew.
    void Reload() { rules_.emplace(); }

    // Whether the last event failed.
    bool IsFailing() const { return lostEvents_ > 0; }

    // Matches that raised no notification of their own.
    uint64_t Suppressed() const { return suppressed_; }

private:
    // One kind of rule. Of its last match that was suppressed: the sender, and the severity or keyword.
    struct Kind {
        RateLimiter limit;
        std::string host;
        std::string what;
    };
    void RaiseSeverity(const std::string &host, const std::string &severity, const std::string &content);
    void RaiseKeyword(const std::string &host, const std::string &keyword, const std::string &content);
    void Suppress(Kind &kind, const std::string &host, const std::string &what);
    void Tell(uint64_t severities, uint64_t keywords);
    template <typename Write>
    void AddEvent(Write write);

    std::optional<NotificationManager> rules_;
    Kind severity_;
    Kind keyword_;
    uint64_t suppressed_ = 0;
    int64_t now_ = 0;
    int64_t nextEvent_ = INT64_MIN; // after a failure, when the next event is tried
    uint64_t lostEvents_ = 0;
};

} // namespace kelo::tool
