#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "kelosyslog/notification.h"
#include "receive/rate_limiter.h"
#include "receive/rule_memory.h"

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

    // Once and for all: notifications and events wait for Deliver, so that the caller can note in a database
    // what happened to them (Memory), and go on with that after a kill (MemorySet). `eventLog` is the path of
    // the event log.
    void Hold(const std::string &eventLog) { eventLog_ = eventLog; }

    // While holding: counts the record for its second, and checks the number of a second that is over. Call
    // EpsTick while no records wait, with the time of day.
    void CountForEps(int64_t utcsec, int64_t now);
    void EpsTick(int64_t utcsec, int64_t now);

    // While holding: sends each notification that is due and adds its event. `note` writes down Memory, and
    // returns whether it could.
    void Deliver(int64_t now, const std::function<bool()> &note);
    const RuleMemory &Memory();
    void MemorySet(RuleMemory memory, int64_t now);

    // Call it about once a second, unless idle: reports what was suppressed in a minute that is over.
    void Tick(int64_t now);

    // Whether nothing is left to report.
    bool IsIdle() const { return !limit_.HasSuppressed() && memory_.waiting.empty(); }

    // Reports what was suppressed and is not reported yet. While holding that waits for Deliver.
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
    using Match = RuleMatch;
    using Kind = RuleMatch::Kind;
    void Handle(Match match, const std::string &message);
    static std::string NameOf(const Match &match);
    static int WriteEvent(const Match &match, const std::string &content);
    void Raise(const Match &match, const std::string &content);
    bool Notify(const Match &match, const std::string &content);
    bool IsHolding() const { return !eventLog_.empty(); }
    bool HoldFirst();
    bool HasEvent(const Notice &notice) const;
    void NotifyAgain();
    void GiveUpFirst();
    void Tell(const RateLimiter::Counts &counts);
    void AddEvent(const Match &match, const std::string &content);

    std::optional<NotificationManager> rules_;
    RateLimiter limit_;
    RuleMemory memory_;    // but its limit, which is that of limit_
    std::string eventLog_; // empty: nothing is held
    uint64_t ids_ = 0;
    uint64_t raised_ = 0;
    uint64_t suppressed_ = 0;
    int64_t nextNotify_ = 0; // when those that failed are tried again
    uint64_t lost_ = 0;
    int64_t now_ = 0;
    int64_t nextEvent_ = INT64_MIN; // after a failure, when the next event is tried
    uint64_t lostEvents_ = 0;
};

} // namespace kelo::tool
