#include "receive/rule_checker.h"

#include <syslog.h>

#include <algorithm>
#include <utility>

#include "base/text_encoding.h"
#include "kelosyslog/logger.h"

namespace kelo::tool {
namespace {

constexpr int64_t kEventPauseSec = 60;
constexpr int64_t kNotifyPauseSec = 2;
constexpr int64_t kNotifyGiveUpSec = 3600;
constexpr size_t kMostWaiting = 100;
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

constexpr const char *kTail = " more within a minute, without a notification of their own";

} // namespace

RuleChecker::RuleChecker(uint64_t notifyLimit)
    : rules_(std::in_place), limit_(notifyLimit, kRulesAtTheirLimit * notifyLimit) {}

void RuleChecker::Check(const _SYSLOG_LOG_DATA_tag &log, int64_t now) {
    now_ = now;
    if (rules_->CheckSev(log.prio))
        Handle({Kind::Severity, PriorTypeToStr(log.prio), log.host}, log.msg);
    if (const std::string keyword = rules_->CheckKeyword(log.msg); !keyword.empty())
        Handle({Kind::Keyword, keyword, log.host}, log.msg);
}

void RuleChecker::CheckEps(uint64_t eps, int64_t now) {
    now_ = now;
    if (rules_->CheckEps(eps))
        Handle({.kind = Kind::Eps, .what = "logs per second", .eps = eps}, "");
}

void RuleChecker::Handle(Match match, const std::string &message) {
    const std::string rule = NameOf(match);
    if (limit_.Allow(rule, now_)) {
        Raise(match, Content(message));
        return;
    }
    if (const auto before = lastSuppressed_.find(rule); before != lastSuppressed_.end())
        match.eps = std::max(match.eps, before->second.eps);
    lastSuppressed_.insert_or_assign(rule, std::move(match));
    ++suppressed_;
}

std::string RuleChecker::NameOf(const Match &match) {
    if (match.kind == Kind::Eps)
        return match.what;
    return (match.kind == Kind::Severity ? "severity [" : "keyword [") + match.what + "]";
}

void RuleChecker::Tick(int64_t now) {
    now_ = now;
    if (now >= nextNotify_)
        NotifyAgain();
    Tell(limit_.TakeSuppressed(now));
}

void RuleChecker::Finish() {
    Tell(limit_.Drain());
    NotifyAgain();
    while (!waiting_.empty())
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
    Match head{.kind = Kind::Eps, .what = ""};
    for (const auto &[rule, count] : counts) {
        Match &match = lastSuppressed_.at(rule);
        if (head.kind == Kind::Eps)
            head = match;
        match.eps = 0;
    }
    Raise(head, Content(content + kTail));
}

void RuleChecker::Raise(const Match &match, const std::string &content) {
    ++raised_;
    // After others that wait, so that they arrive in order.
    if (!waiting_.empty() || !Notify(match, content)) {
        if (waiting_.size() == kMostWaiting)
            GiveUpFirst();
        if (waiting_.empty())
            nextNotify_ = now_ + kNotifyPauseSec;
        waiting_.push_back({match, content, now_});
    }
    AddEvent(match, content);
}

bool RuleChecker::Notify(const Match &match, const std::string &content) {
    switch (match.kind) {
    case Kind::Severity:
        return rules_->NotificationSendSev(match.host, match.what, content) == 0;
    case Kind::Keyword:
        return rules_->NotificationSendKeyword(match.host, match.what, content) == 0;
    default:
        return rules_->NotificationSendEps(match.eps) == 0;
    }
}

void RuleChecker::NotifyAgain() {
    while (!waiting_.empty() && Notify(waiting_.front().match, waiting_.front().content))
        waiting_.pop_front();
    while (!waiting_.empty() && now_ - waiting_.front().since >= kNotifyGiveUpSec)
        GiveUpFirst();
    nextNotify_ = now_ + kNotifyPauseSec;
}

void RuleChecker::GiveUpFirst() {
    const Match &match = waiting_.front().match;
    const std::string host = match.host.empty() ? "" : " from " + match.host;
    syslog(LOG_ERR, "A notification was given up, as it could not be put into the spool: %s%s",
           match.what.c_str(), host.c_str());
    waiting_.pop_front();
    ++lost_;
}

int RuleChecker::WriteEvent(const Match &match, const std::string &content) {
    switch (match.kind) {
    case Kind::Severity:
        return Logger().LogAddNotifySev(match.what, content);
    case Kind::Keyword:
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
