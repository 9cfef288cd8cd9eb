#include "receive/rule_checker.h"

#include "notify/notify_fixture.h"
#include "receive/rate_limiter.h"
#include "receive/rule_memory.h"

namespace kelo::test {
namespace {

using tool::RateLimiter;
using RuleChecks = NotifyTest;

TEST_F(RuleChecks, LimitTheNotificationsOfARateThatStays) {
    CreateLogDatabase(root_.File("usr/kelo/etc/kelosyslog.db"), "kelosyslog.sql");
    WriteRules(RuleText("busy", 1, "0", "500", "") + RuleText("worst", 0, "2", "0", ""));
    tool::RuleChecker checker(2);
    const auto sent = [] {
        std::string rates;
        for (const SentNotification &one : PlatformCalls::Sent())
            rates += one.values.contains("%EPS%") ? one.values.at("%EPS%") + " "
                                                  : one.values.at("%SYSLOG_CONTENT%");
        return rates;
    };
    for (int64_t second = 0; second < 60; ++second)
        checker.CheckEps(second == 30 ? 900 : second == 31 ? 499 : 600, second);
    EXPECT_EQ(sent(), "600 600 ");
    EXPECT_EQ(checker.Suppressed(), 57U);
    checker.Tick(60);
    EXPECT_EQ(sent(), "600 600 900 ") << "the highest of those that were left out";
    for (int64_t second = 60; second < 120; ++second)
        checker.CheckEps(600, second);
    _SYSLOG_LOG_DATA_tag fire;
    fire.prio = SYSLOG_PRIO_EMERG;
    fire.msg = "fire";
    for (int i = 0; i < 3; ++i)
        checker.Check(fire, 119);
    checker.Finish();
    EXPECT_THAT(sent(), HasSubstr("fire"
                                  "fire"
                                  "58 of logs per second, 1 of severity [emerg] more within"));
    EXPECT_EQ(
        RunSql(root_.File("usr/kelo/etc/kelosyslog.db"), "SELECT count(*) FROM log WHERE event GLOB '*EPS*'"),
        "5");
}

// What a killed receiver has counted and held back goes on in the next one.
TEST_F(RuleChecks, GoOnWhereTheyWere) {
    CreateLogDatabase(root_.File("usr/kelo/etc/kelosyslog.db"), "kelosyslog.sql");
    WriteRules(RuleText("busy", 1, "0", "500", "") + RuleText("worst", 0, "2", "0", ""));
    tool::SqliteConnection database(root_.File("rules.db"), {.mode = tool::SqliteMode::kCreate});
    _SYSLOG_LOG_DATA_tag fire;
    fire.prio = SYSLOG_PRIO_EMERG;
    fire.msg = "fire";
    for (const int64_t now : {10, 11, 12}) { // a receiver each
        tool::RuleChecker checker(1);
        checker.Hold(root_.File("usr/kelo/etc/kelosyslog.db"));
        checker.MemorySet(tool::LoadRuleMemory(database, now), now);
        for (int i = 0; i < 200; ++i)
            checker.CountForEps(1000, now);
        checker.Check(fire, now);
        if (now == 12) {
            checker.EpsTick(1001, now);
            checker.Tick(70);
            checker.Deliver(70, [] { return true; });
        }
        tool::SaveRuleMemory(database, checker.Memory());
    }
    std::string sent;
    for (const SentNotification &one : PlatformCalls::Sent())
        sent += one.values.contains("%EPS%") ? one.values.at("%EPS%") + " "
                                             : one.values.at("%SYSLOG_CONTENT%") + " ";
    EXPECT_EQ(sent, "fire 600 2 more within a minute, without a notification of their own ");
}

TEST(RateLimiter, BoundsEveryMinuteAndTellsTheRestOfEachRule) {
    using Counts = RateLimiter::Counts;
    struct Step {
        int64_t now;
        std::string matches; // a letter for the rule of each
        std::string raised;
        Counts told; // asked after the matches
    };
    const struct {
        const char *what;
        std::vector<Step> steps;
        Counts rest;
    } kCases[] = {
        {"few matches",
         {{0, "aa", "aa", {}}, {30, "a", "a", {}}, {60, "aaa", "aaa", {}}, {7200, "a", "a", {}}},
         {}},
        {"a flood",
         {{5, "aaaaaaaaaa", "aaa", {}},
          {64, "aa", "", {}},
          {65, "", "", {{"a", 9}}},
          {66, "aaaaa", "aaa", {}},
          {124, "", "", {}}},
         {{"a", 2}}},
        {"told after matches of the next minute",
         {{0, "aaaa", "aaa", {}}, {60, "aaaa", "aaa", {{"a", 1}}}, {120, "", "", {{"a", 1}}}},
         {}},
        {"a rare rule beside a noisy one", {{0, "aaaaaab", "aaab", {}}, {60, "", "", {{"a", 3}}}}, {}},
        {"many noisy rules: five in all, and one of each",
         {{0, "aaaabbbbccd", "aaabbcd", {}}, {60, "", "", {{"a", 1}, {"b", 2}, {"c", 1}}}},
         {}},
        {"a flood long ago",
         {{-100, "aaaaa", "aaa", {}}, {1000, "", "", {{"a", 2}}}, {1000, "aaaa", "aaa", {}}},
         {{"a", 1}}},
    };
    for (const auto &[what, steps, rest] : kCases) {
        RateLimiter limit(3, 5);
        for (const auto &[now, matches, expected, told] : steps) {
            std::string raised;
            for (const char rule : matches)
                raised += limit.Allow(std::string(1, rule), now) ? std::string(1, rule) : "";
            EXPECT_EQ(raised, expected) << what << " at " << now;
            EXPECT_EQ(limit.TakeSuppressed(now), told) << what << " at " << now;
        }
        EXPECT_EQ(limit.HasSuppressed(), !rest.empty()) << what;
        EXPECT_EQ(limit.Drain(), rest) << what;
    }
}

} // namespace
} // namespace kelo::test
