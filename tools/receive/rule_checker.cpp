#include "receive/rule_checker.h"

#include <syslog.h>

#include <utility>

#include "kelosyslog/logger.h"

namespace kelo::tool {
namespace {

constexpr int64_t kEventPauseSec = 60;

// The text, cut where a notification could not carry it: it takes fewer than 2048 bytes with its quotes and
// backslashes escaped. No character of UTF-8 is cut in two.
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
    while (length > 0 && (static_cast<unsigned char>(text[length]) & 0xc0U) == 0x80)
        --length;
    return text.substr(0, length) + "...";
}

std::string MoreLogs(uint64_t count) {
    return std::to_string(count) + " more within a minute, without a notification of their own";
}

} // namespace

RuleChecker::RuleChecker(uint64_t notifyLimit)
    : rules_(std::in_place), severity_{RateLimiter(notifyLimit), "", ""}, keyword_{RateLimiter(notifyLimit),
                                                                                   "", ""} {}

void RuleChecker::Check(const _SYSLOG_LOG_DATA_tag &log, int64_t now) {
    now_ = now;
    if (rules_->CheckSev(log.prio)) {
        const std::string severity = PriorTypeToStr(log.prio);
        if (severity_.limit.Allow(now))
            RaiseSeverity(log.host, severity, Content(log.msg));
        else
            Suppress(severity_, log.host, severity);
    }
    if (const std::string keyword = rules_->CheckKeyword(log.msg); !keyword.empty()) {
        if (keyword_.limit.Allow(now))
            RaiseKeyword(log.host, keyword, Content(log.msg));
        else
            Suppress(keyword_, log.host, keyword);
    }
}

void RuleChecker::Tick(int64_t now) {
    now_ = now;
    Tell(severity_.limit.TakeSuppressed(now), keyword_.limit.TakeSuppressed(now));
}

void RuleChecker::Finish() {
    Tell(severity_.limit.Drain(), keyword_.limit.Drain());
}

void RuleChecker::Tell(uint64_t severities, uint64_t keywords) {
    if (severities > 0)
        RaiseSeverity(severity_.host, severity_.what, MoreLogs(severities));
    if (keywords > 0)
        RaiseKeyword(keyword_.host, keyword_.what, MoreLogs(keywords));
}

void RuleChecker::Suppress(Kind &kind, const std::string &host, const std::string &what) {
    kind.host = host;
    kind.what = what;
    ++suppressed_;
}

void RuleChecker::RaiseSeverity(const std::string &host, const std::string &severity,
                                const std::string &content) {
    rules_->NotificationSendSev(host, severity, content);
    AddEvent([&] { return Logger().LogAddNotifySev(severity, content); });
}

void RuleChecker::RaiseKeyword(const std::string &host, const std::string &keyword,
                               const std::string &content) {
    rules_->NotificationSendKeyword(host, keyword, content);
    AddEvent([&] { return Logger().LogAddNotifyKw(keyword, content); });
}

// Each event that finds its database locked takes seconds, in which nothing is received.
template <typename Write>
void RuleChecker::AddEvent(Write write) {
    if (now_ < nextEvent_) {
        ++lostEvents_;
    } else if (write() != 0) {
        nextEvent_ = now_ + kEventPauseSec;
        ++lostEvents_;
    } else if (const uint64_t lost = std::exchange(lostEvents_, 0); lost > 0) {
        syslog(LOG_WARNING, "%llu events of rules were lost, as they could not be written",
               static_cast<unsigned long long>(lost));
    }
}

} // namespace kelo::tool
