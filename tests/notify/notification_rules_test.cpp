#include "notify/notify_fixture.h"

using namespace kelo::test;

using NotificationRules = NotifyTest;

TEST_F(NotificationRules, AreCheckedWhenEnabled) {
    WriteRules(RuleText("off", 1, "0", "0", "", "0") + RuleText("eps", 1, "0", "5000000000", "") +
               RuleText("sev", 0, "3", "0", "") + RuleText("sev off", 0, "7", "0", "", "0") +
               RuleText("k0", 2, "0", "0", "") + RuleText("k1", 2, "0", "0", "disk", "0") +
               RuleText("k2", 2, "0", "0", "error") + RuleText("k3", 2, "0", "0", "Err") +
               RuleText("k4", 2, "0", "0", "Error") + RuleText("odd", 7, "7", "0", "odd"));
    NotificationManager manager;
    EXPECT_FALSE(manager.CheckEps(4999999999));
    EXPECT_TRUE(manager.CheckEps(5000000000));
    EXPECT_TRUE(manager.CheckEps(UINT64_MAX));
    for (int pri = -1; pri < 9; ++pri)
        EXPECT_EQ(manager.CheckSev(static_cast<_SYSLOG_DB_PRIORITY_tag>(pri)), pri <= 3) << pri;
    EXPECT_EQ(manager.CheckKeyword("disk Error"), "Err");
    EXPECT_EQ(manager.CheckKeyword("Error, error"), "error");
    EXPECT_EQ(manager.CheckKeyword("disk odd e.ror"), "");
    EXPECT_THAT(Messages(), IsEmpty());
}

TEST_F(NotificationRules, AreLoadedUpToTheFirstBrokenSection) {
    WriteRules(RuleText("one", 1, "0", "100", "") + "[two]\nnotify_pat=\"open\n" +
               RuleText("three", 0, "7", "0", ""));
    NotificationManager manager;
    EXPECT_THAT(Messages(),
                ElementsAre(HasSubstr("notify.conf:8: "), "utils:85 Fail to do TORVCFileGetSection",
                            "Fail to get notification setting two"));
    EXPECT_TRUE(manager.CheckEps(100));
    EXPECT_FALSE(manager.CheckSev(SYSLOG_PRIO_EMERG));
    EXPECT_EQ(manager.ConfigLoad(RulePath()), 0);
}
