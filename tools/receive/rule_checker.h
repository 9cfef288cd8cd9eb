#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <optional>
#include <string>

#include "kelosyslog/notification.h"
#include "receive/rate_limiter.h"

namespace kelo::tool {

// Checks records, and their number, against the rules. A match sends a notification and adds an event. Their
// number a minute is limited for each rule (a keyword, a severity, or the records a second) and for all
// (RateLimiter).
//
// A notification that fails because the spool has no room is tried again for an hour; at most a hundred wait.
// A failed event is only reported in the system log, by the library; then no events are added for a minute.
//
// Times are seconds of any clock that does not go back.
class RuleChecker {
public:
    // Loads the rules. `notifyLimit`: notifications a minute for each rule, at least 1.
    explicit RuleChecker(uint64_t notifyLimit);

    void Check(const _SYSLOG_LOG_DATA_tag &log, int64_t now);

    // The same for the number of records of a sample.
    void CheckEps(uint64_t eps, int64_t now);

    // Call it about once a second, unless idle: reports what was suppressed in a minute that is over.
    void Tick(int64_t now);

    // Whether nothing is left to report.
    bool IsIdle() const { return !limit_.HasSuppressed() && waiting_.empty(); }

    // Reports what was suppressed and is not reported yet.
    void Finish();

    // Reloads the rules.
    void Reload() { rules_.emplace(); }

    // Whether the last event failed.
    bool IsFailing() const { return lostEvents_ > 0; }

    // Notifications that were raised, delivered or not.
    uint64_t Raised() const { return raised_; }

    // Matches without a notification of their own.
    uint64_t Suppressed() const { return suppressed_; }

    // Notifications that were given up.
    uint64_t Lost() const { return lost_; }

private:
    enum class Kind { Severity, Keyword, Eps };
    // The match of a record and its host, or of a number of records.
    struct Match {
        Kind kind;
        std::string what; // the severity, the keyword or the rule about numbers
        std::string host = {};
        uint64_t eps = 0;
    };
    struct Notification {
        Match match;
        std::string content;
        int64_t since; // when it failed first
    };
    void Handle(Match match, const std::string &message);
    static std::string NameOf(const Match &match);
    static int WriteEvent(const Match &match, const std::string &content);
    void Raise(const Match &match, const std::string &content);
    bool Notify(const Match &match, const std::string &content);
    void NotifyAgain();
    void GiveUpFirst();
    void Tell(const RateLimiter::Counts &counts);
    void AddEvent(const Match &match, const std::string &content);

    std::optional<NotificationManager> rules_;
    RateLimiter limit_;
    std::map<std::string, Match> lastSuppressed_; // by rule, with the highest number of records
    uint64_t raised_ = 0;
    uint64_t suppressed_ = 0;
    std::deque<Notification> waiting_; // those that failed, oldest first
    int64_t nextNotify_ = 0;           // when they are tried again
    uint64_t lost_ = 0;
    int64_t now_ = 0;
    int64_t nextEvent_ = INT64_MIN; // after a failure, when the next event is tried
    uint64_t lostEvents_ = 0;
};

} // namespace kelo::tool
