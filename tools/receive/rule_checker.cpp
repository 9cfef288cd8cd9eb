#include "receive/rule_checker.h"

#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <utility>

#include "base/text_encoding.h"
#include "keloplatform/notify_hold.h"
#include "kelosyslog/logger.h"

namespace kelo::tool {
namespace {

constexpr int64_t kEventPauseSec = 60;
constexpr int64_t kNotifyPauseSec = 2;
constexpr int64_t kNotifyGiveUpSec = 3600;
constexpr size_t kMostWaiting = 100;
// A record that is later than this has come after the clock was set back.
constexpr int64_t kMostLateSec = 5;
// This many rules may each use their whole limit; the others still get one notification a minute each.
constexpr uint64_t kRulesAtTheirLimit = 5;

// The text, cut to the limit of a notification: fewer than 2048 bytes with its quotes and backslashes
// escaped. No UTF-8 character is split.
std::string Content(const std::string &text) {
    constexpr size_t kMostBytes = 2000;
    size_t length = 0;
    for (size_t bytes = 0; length < text.size(); ++length) {
        bytes += text[length] == '"' || text[length] == '\\' ? 2 : 1;
        if (bytes > kMostBytes)
            break;
    }
    if (length == text.size())
        return text;
    return text.substr(0, WholeCharacters(text, length)) + "...";
}

// As the platform makes them: sorts by time, and is unique among all processes and calls.
std::string NewId() {
    static unsigned counter = 0;
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    char id[80];
    std::snprintf(id, sizeof id, "%012lld.%09ld-%ld-r%u", static_cast<long long>(now.tv_sec), now.tv_nsec,
                  static_cast<long>(getpid()), counter++);
    return id;
}

constexpr int kEventsLookedAt = 100;

constexpr const char *kTail = " more within a minute, without a notification of their own";

} // namespace

RuleChecker::RuleChecker(uint64_t notifyLimit)
    : rules_(std::in_place), limit_(notifyLimit, kRulesAtTheirLimit * notifyLimit) {}

void RuleChecker::Check(const _SYSLOG_LOG_DATA_tag &log, int64_t now) {
    now_ = now;
    if (rules_->CheckSev(log.prio))
        Handle({Kind::kSeverity, PriorTypeToStr(log.prio), log.host}, log.msg);
    if (const std::string keyword = rules_->CheckKeyword(log.msg); !keyword.empty())
        Handle({Kind::kKeyword, keyword, log.host}, log.msg);
}

void RuleChecker::CheckEps(uint64_t eps, int64_t now) {
    now_ = now;
    if (rules_->CheckEps(eps))
        Handle({.kind = Kind::kEps, .what = "logs per second", .eps = eps}, "");
}

void RuleChecker::Handle(Match match, const std::string &message) {
    const std::string rule = NameOf(match);
    if (limit_.Allow(rule, now_)) {
        Raise(match, Content(message));
        return;
    }
    if (const auto before = memory_.suppressed.find(rule); before != memory_.suppressed.end())
        match.eps = std::max(match.eps, before->second.eps);
    memory_.suppressed.insert_or_assign(rule, std::move(match));
    ++suppressed_;
}

std::string RuleChecker::NameOf(const Match &match) {
    if (match.kind == Kind::kEps)
        return match.what;
    return (match.kind == Kind::kSeverity ? "severity [" : "keyword [") + match.what + "]";
}

void RuleChecker::Tick(int64_t now) {
    now_ = now;
    if (now >= nextNotify_ && !IsHolding())
        NotifyAgain();
    Tell(limit_.TakeSuppressed(now));
}

void RuleChecker::Finish() {
    Tell(limit_.Drain());
    if (IsHolding())
        return;
    NotifyAgain();
    while (!memory_.waiting.empty())
        GiveUpFirst();
}

// One notification, under the name of the first rule whose notification has a text. That of the records per
// second has none: alone, it names the highest number.
void RuleChecker::Tell(const RateLimiter::Counts &counts) {
    if (counts.empty())
        return;
    std::string content;
    for (const auto &[rule, count] : counts)
        content +=
            (content.empty() ? "" : ", ") + std::to_string(count) + (counts.size() > 1 ? " of " + rule : "");
    Match head{.kind = Kind::kEps, .what = ""};
    for (const auto &[rule, count] : counts) {
        Match &match = memory_.suppressed.at(rule);
        if (head.kind == Kind::kEps)
            head = match;
        match.eps = 0;
    }
    Raise(head, Content(content + kTail));
}

void RuleChecker::Raise(const Match &match, const std::string &content) {
    ++raised_;
    // After others that wait, so that they arrive in order.
    if (IsHolding() || !memory_.waiting.empty() || !Notify(match, content)) {
        // Those that are only held until their records are stored are on their way.
        if (memory_.waiting.size() >= kMostWaiting && (!IsHolding() || nextNotify_ != 0))
            GiveUpFirst();
        if (memory_.waiting.empty() && !IsHolding())
            nextNotify_ = now_ + kNotifyPauseSec;
        memory_.waiting.push_back(
            {.match = match, .content = content, .id = IsHolding() ? NewId() : "", .since = now_});
    }
    if (!IsHolding())
        AddEvent(match, content);
}

bool RuleChecker::Notify(const Match &match, const std::string &content) {
    switch (match.kind) {
    case Kind::kSeverity:
        return rules_->NotificationSendSev(match.host, match.what, content) == 0;
    case Kind::kKeyword:
        return rules_->NotificationSendKeyword(match.host, match.what, content) == 0;
    default:
        return rules_->NotificationSendEps(match.eps) == 0;
    }
}

void RuleChecker::NotifyAgain() {
    while (!memory_.waiting.empty() && Notify(memory_.waiting.front().match, memory_.waiting.front().content))
        memory_.waiting.pop_front();
    while (!memory_.waiting.empty() && now_ - memory_.waiting.front().since >= kNotifyGiveUpSec)
        GiveUpFirst();
    nextNotify_ = now_ + kNotifyPauseSec;
}

void RuleChecker::GiveUpFirst() {
    const Match &match = memory_.waiting.front().match;
    const std::string host = match.host.empty() ? "" : " from " + match.host;
    syslog(LOG_ERR, "A notification was given up, as it could not be put into the spool: %s%s",
           match.what.c_str(), host.c_str());
    memory_.waiting.pop_front();
    ++lost_;
}

// ---- Holding ----

void RuleChecker::CountForEps(int64_t utcsec, int64_t now) {
    // Connections are read side by side, so that records of two seconds mix.
    if (utcsec > memory_.second || memory_.second - utcsec > kMostLateSec)
        EpsTick(utcsec, now);
    ++memory_.records;
}

void RuleChecker::EpsTick(int64_t utcsec, int64_t now) {
    if (utcsec == memory_.second)
        return;
    memory_.second = utcsec;
    if (const uint64_t records = std::exchange(memory_.records, 0); records > 0)
        CheckEps(records, now);
}

const RuleMemory &RuleChecker::Memory() {
    memory_.limit = limit_.StateGet();
    return memory_;
}

void RuleChecker::MemorySet(RuleMemory memory, int64_t now) {
    memory_ = std::move(memory);
    memory_.limit.begin = std::min(memory_.limit.begin, now); // the machine may have been started again
    limit_.StateSet(memory_.limit);
}

void RuleChecker::Deliver(int64_t now, const std::function<bool()> &note) {
    now_ = now;
    if (memory_.waiting.empty() || now < nextNotify_)
        return;
    nextNotify_ = now + kNotifyPauseSec; // unless all of it succeeds
    while (!memory_.waiting.empty()) {
        Notice &first = memory_.waiting.front();
        if (first.stage == Notice::Stage::kRaised && !HoldFirst())
            return;
        if (first.stage == Notice::Stage::kHeld && !note())
            return;
        first.stage = Notice::Stage::kNoted;
        if (KELONotifyRelease(first.id.c_str()) != 0)
            return;
        if (!first.isInDoubt || !HasEvent(first))
            AddEvent(first.match, first.content);
        memory_.waiting.pop_front();
    }
    nextNotify_ = 0;
    note();
}

// Returns false when it has to be tried again.
bool RuleChecker::HoldFirst() {
    Notice &first = memory_.waiting.front();
    KELONotifyHold(first.id.c_str());
    const bool isHeld = Notify(first.match, first.content);
    KELONotifyHold(nullptr);
    if (!isHeld) {
        if (now_ - first.since >= kNotifyGiveUpSec)
            GiveUpFirst();
        return false;
    }
    first.lastEvent = 0;
    for (const auto &event : Logger().LogEnum(eventLog_, 0, kEventsLookedAt))
        first.lastEvent = std::max<int64_t>(first.lastEvent, event.id);
    first.stage = Notice::Stage::kHeld;
    return true;
}

// Whether its event was added before a kill.
bool RuleChecker::HasEvent(const Notice &notice) const {
    const std::string what =
        "[" + (notice.match.kind == Kind::kEps ? std::to_string(notice.match.eps) : notice.match.what) + "]";
    const auto events = Logger().LogEnum(eventLog_, 0, kEventsLookedAt);
    return std::any_of(events.begin(), events.end(), [&](const auto &event) {
        return event.id > notice.lastEvent && event.event.find(what) != std::string::npos &&
               event.event.find(notice.content) != std::string::npos;
    });
}

int RuleChecker::WriteEvent(const Match &match, const std::string &content) {
    switch (match.kind) {
    case Kind::kSeverity:
        return Logger().LogAddNotifySev(match.what, content);
    case Kind::kKeyword:
        return Logger().LogAddNotifyKw(match.what, content);
    default:
        return Logger().LogAddNotifyEps(match.eps);
    }
}

// An event with a locked database takes seconds, in which nothing is received.
void RuleChecker::AddEvent(const Match &match, const std::string &content) {
    if (now_ < nextEvent_) {
        ++lostEvents_;
    } else if (WriteEvent(match, content) != 0) {
        nextEvent_ = now_ + kEventPauseSec;
        ++lostEvents_;
    } else if (const uint64_t lost = std::exchange(lostEvents_, 0); lost > 0) {
        syslog(LOG_WARNING, "%llu events of rules were lost, as they could not be written",
               static_cast<unsigned long long>(lost));
    }
}

} // namespace kelo::tool
