#include "receive/rule_checker.h"

#include "notify/notify_fixture.h"

namespace kelo::test {
namespace {

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

} // namespace
} // namespace kelo::test
