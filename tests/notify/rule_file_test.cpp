#include "notify/notify_fixture.h"

using namespace kelo::test;

using RuleFile = NotifyTest;
using NotificationSwitches = NotifyTest;

TEST_F(RuleFile, ReadsBackWhatTheFormOfTheNumbersKeeps) {
    const struct {
        uint64_t eps;
        std::string written;
        uint64_t read;
    } cases[] = {
        {2147483647, "\"2147483647\"", 2147483647},
        {2147483648, "\"18446744071562067968\"", 9223372036854775807},
        {5000000000, "\"705032704\"", 705032704},
    };
    WriteRules("");
    for (const auto &[eps, written, readEps] : cases) {
        _SYSLOG_NOTIFY_RULES_tag rule{"R", -1,       static_cast<_SYSLOG_DB_PRIORITY_tag>(-1),
                                      eps, "p=\"\\", false};
        ASSERT_EQ(SyslogNotifyConfSet(RulePath(), "", rule), 0);
        EXPECT_THAT(ReadFile(RulePath()), HasSubstr("notify_eps=" + written + "\n"));
        _SYSLOG_NOTIFY_RULES_tag read;
        ASSERT_EQ(SyslogNotifyConfGet(RulePath(), "R", read), 0);
        EXPECT_EQ(read.type, -1);
        EXPECT_EQ(read.pri, -1);
        EXPECT_EQ(read.eps, readEps);
        EXPECT_EQ(read.pattern, rule.pattern);
        EXPECT_FALSE(read.enable);
    }
    EXPECT_THAT(Messages(), IsEmpty());
}

TEST_F(RuleFile, ReadsOddAndMissingValues) {
    WriteRules(
        "[none]\n[true]\nnotify_enable=\"true\"\n[blank]\nnotify_enable=\" 1\"\n[plain]\nnotify_type=1x\n"
        "notify_eps=9223372036854775808\nnotify_enable=1\nnotify_pat=a b\n");
    _SYSLOG_NOTIFY_RULES_tag rule;
    ASSERT_EQ(SyslogNotifyConfGet(RulePath(), "plain", rule), 0);
    EXPECT_EQ(rule.type, 1);
    EXPECT_EQ(rule.eps, 9223372036854775807u);
    EXPECT_TRUE(rule.enable);
    EXPECT_EQ(rule.pattern, "a b");
    for (const char *name : {"none", "true", "blank"}) {
        rule = {"before", 2, SYSLOG_PRIO_ERR, 9, "old", true};
        ASSERT_EQ(SyslogNotifyConfGet(RulePath(), name, rule), 0);
        EXPECT_FALSE(rule.enable) << name;
        EXPECT_EQ(rule.eps, 0u);
    }
}

TEST_F(RuleFile, ReportsFailureWithTheRecordUnchanged) {
    WriteRules("[R]\nnotify_type=\"1\"\nbroken\n");
    _SYSLOG_NOTIFY_RULES_tag rule{"before", 2, SYSLOG_PRIO_ERR, 9, "old", true};
    EXPECT_EQ(SyslogNotifyConfGet(RulePath(), "missing", rule), -1);
    EXPECT_THAT(Messages(), ElementsAre("utils:85 Fail to do TORVCFileGetSection"));
    EXPECT_EQ(SyslogNotifyConfGet(RulePath(), "R", rule), -1);
    EXPECT_THAT(Messages(),
                ElementsAre(HasSubstr("notify.conf:3: "), "utils:85 Fail to do TORVCFileGetSection"));
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(SyslogNotifyConfGet(RulePath(), "R", rule), -1);
    EXPECT_THAT(Messages(), ElementsAre("utils:81 Fail to allocate memory"));
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(SyslogNotifyConfSet(RulePath(), "R", rule), -1);
    EXPECT_THAT(Messages(), ElementsAre("utils:124 Fail to allocate memory"));
    EXPECT_EQ(rule.name, "before");
    EXPECT_EQ(rule.eps, 9u);
    EXPECT_TRUE(rule.enable);
}

TEST_F(NotificationSwitches, AreOnWhenAnyChannelIs) {
    const std::string mail = "smtp_server=\"mx\"\nsmtp_to=\"a@b.c, d@e.f\"\nsmtp_mail_enabled=",
                      noMail = "smtp_mail_enabled=\"no\"\n";
    const std::string sms = "sms_enabled=\"yes\"\n", mobile = "pushservice_mobile_enabled=\"no\"\n";
    const std::string msn = "pushservice_msn_enabled=\"no\"\n",
                      push = mobile + msn + "pushservice_skype_enabled=\"no\"\n";
    const struct {
        std::string settings;
        bool isOn;
        std::vector<std::string> messages;
    } cases[] = {
        {mail + "\"no\"\n" + push, false, {}},
        {mail + "\"yes\"\n" + push, true, {}},
        {"smtp_mail_enabled=\"yes\"\nsmtp_to=\"a@b.c\"\n" + push, false, {}},
        {"smtp_mail_enabled=\"yes\"\nsmtp_to=\" , ;\"\nsmtp_server=\"mx\"\n" + push, false, {}},
        {noMail + sms + push, true, {}},
        {noMail + "pushservice_skype_enabled=\"yes\"\n" + push, true, {}},
        {sms + push, false, {"utils:166 Fail to get smtp mail setting"}},
        {noMail + sms, false, {"utils:188 Fail to get mobile setting"}},
        {noMail + sms + mobile + msn, false, {"utils:204 Fail to get skype setting"}},
    };
    for (const auto &[settings, isOn, messages] : cases) {
        WriteSettings(settings);
        EXPECT_EQ(IsNotificationSet(), isOn) << settings;
        EXPECT_EQ(Messages(), messages) << settings;
    }
}

TEST_F(NotificationSwitches, AreOffWhenTheRecordsCannotBeRead) {
    EXPECT_FALSE(IsNotificationSet());
    EXPECT_THAT(Messages(), ElementsAre("utils:161 Fail to get mail setting"));
    WriteSettings("smtp_mail_enabled=\"no\"\nsms_enabled=\"yes\"\n");
    PlatformCalls::FailFrom(1, 1);
    EXPECT_FALSE(IsNotificationSet());
    EXPECT_THAT(Messages(), ElementsAre("utils:178 Fail to get sms setting"));
}
