// The rules in their file and as they are checked, and whether notifications are set at all.

#include "notify/notify_fixture.h"

namespace kelo::test {
namespace {

class Rules : public NotifyTest {
protected:
    // A rule as text, read into one that is not empty; after "failed: " where it could not be read.
    std::string Read(const std::string &section) {
        _SYSLOG_NOTIFY_RULES_tag rule{"before", 2, SYSLOG_PRIO_ERR, 9, "old", true};
        const bool isRead = SyslogNotifyConfGet(rules_, section, rule) == 0;
        return (isRead ? "" : "failed: ") + rule.name + "|" + std::to_string(rule.type) + "|" +
               std::to_string(rule.pri) + "|" + std::to_string(rule.eps) + "|" + rule.pattern + "|" +
               std::to_string(rule.enable);
    }
};

TEST_F(Rules, AreCheckedWhenEnabled) {
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
    EXPECT_THAT(TakeTexts(), IsEmpty());
}

TEST_F(Rules, AreLoadedUpToTheFirstBrokenSection) {
    WriteRules(RuleText("one", 1, "0", "100", "") + "[two]\nnotify_pat=\"open\n" +
               RuleText("three", 0, "7", "0", ""));
    NotificationManager manager;
    EXPECT_THAT(TakeTexts(),
                ElementsAre(HasSubstr("notify.conf:8: "), "utils:85 Fail to do TORVCFileGetSection",
                            "Fail to get notification setting two"));
    EXPECT_TRUE(manager.CheckEps(100));
    EXPECT_FALSE(manager.CheckSev(SYSLOG_PRIO_EMERG));
    EXPECT_EQ(manager.ConfigLoad(rules_), 0);
}

TEST_F(Rules, AreReadBackAsTheFormOfTheNumbersKeepsThem) {
    const std::tuple<uint64_t, const char *, const char *> cases[] = {
        {2147483647, "\"2147483647\"", "2147483647"},
        {2147483648, "\"18446744071562067968\"", "9223372036854775807"},
        {5000000000, "\"705032704\"", "705032704"},
    };
    WriteRules("");
    for (const auto &[eps, written, read] : cases) {
        const auto noSeverity = static_cast<_SYSLOG_DB_PRIORITY_tag>(-1);
        ASSERT_EQ(SyslogNotifyConfSet(rules_, "", {"R", -1, noSeverity, eps, "p=\"\\", false}), 0);
        EXPECT_THAT(ReadFile(rules_), HasSubstr(std::string("notify_eps=") + written + "\n"));
        EXPECT_EQ(Read("R"), std::string("R|-1|-1|") + read + "|p=\"\\|0");
    }
    EXPECT_THAT(TakeTexts(), IsEmpty());
}

TEST_F(Rules, MayLackValuesAndFailWithTheRecordUnchanged) {
    WriteRules(
        "[none]\n[true]\nnotify_enable=\"true\"\n[blank]\nnotify_enable=\" 1\"\n[plain]\nnotify_type=1x\n"
        "notify_eps=9223372036854775808\nnotify_enable=1\nnotify_pat=a b\n[R]\nnotify_type=\"1\"\nbroken\n");
    EXPECT_EQ(Read("plain"), "plain|1|0|9223372036854775807|a b|1");
    for (const std::string name : {"none", "true", "blank"})
        EXPECT_EQ(Read(name), name + "|0|0|0||0");
    const std::string unchanged = "failed: before|2|3|9|old|1";
    EXPECT_EQ(Read("missing"), unchanged);
    EXPECT_THAT(TakeTexts(), ElementsAre("utils:85 Fail to do TORVCFileGetSection"));
    EXPECT_EQ(Read("R"), unchanged);
    EXPECT_THAT(TakeTexts(),
                ElementsAre(HasSubstr("notify.conf:13: "), "utils:85 Fail to do TORVCFileGetSection"));
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(Read("plain"), unchanged);
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(SyslogNotifyConfSet(rules_, "R", {}), -1);
    EXPECT_THAT(TakeTexts(),
                ElementsAre("utils:81 Fail to allocate memory", "utils:124 Fail to allocate memory"));
}

using NotificationSwitches = NotifyTest;

TEST_F(NotificationSwitches, AreOnWhenAnyChannelIs) {
    const std::string to = "smtp_server=\"mx\"\nsmtp_to=\"a@b.c, d@e.f\"\n",
                      mail = "smtp_mail_enabled=\"yes\"\n", noMail = "smtp_mail_enabled=\"no\"\n",
                      sms = "sms_enabled=\"yes\"\n", mobile = "pushservice_mobile_enabled=\"no\"\n",
                      msn = "pushservice_msn_enabled=\"no\"\n",
                      push = mobile + msn + "pushservice_skype_enabled=\"no\"\n";
    const std::tuple<std::string, bool, std::vector<std::string>> cases[] = {
        {to + noMail + push, false, {}},
        {to + mail + push, true, {}},
        {mail + "smtp_to=\"a@b.c\"\n" + push, false, {}},
        {mail + "smtp_to=\" , ;\"\nsmtp_server=\"mx\"\n" + push, false, {}},
        {noMail + sms + push, true, {}},
        {noMail + "pushservice_skype_enabled=\"yes\"\n" + push, true, {}},
        {sms + push, false, {"utils:166 Fail to get smtp mail setting"}},
        {noMail + sms, false, {"utils:188 Fail to get mobile setting"}},
        {noMail + sms + mobile + msn, false, {"utils:204 Fail to get skype setting"}},
    };
    EXPECT_FALSE(IsNotificationSet());
    EXPECT_THAT(TakeTexts(), ElementsAre("utils:161 Fail to get mail setting"));
    for (const auto &[settings, isOn, messages] : cases) {
        WriteSettings(settings);
        EXPECT_EQ(IsNotificationSet(), isOn) << settings;
        EXPECT_EQ(TakeTexts(), messages) << settings;
    }
    PlatformCalls::FailFrom(1, 1);
    EXPECT_FALSE(IsNotificationSet());
    EXPECT_THAT(TakeTexts(), ElementsAre("utils:178 Fail to get sms setting"));
}

} // namespace
} // namespace kelo::test
