#include "notify/notify_fixture.h"

using namespace kelo::test;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

constexpr char kClassKey[] = "DESKTOP_NOTIFY_CLASSNAME";
constexpr char kClass[] = "KELO.ZRT.Quillbay.BuiltIn";

// A content whose escaped form has `size` bytes.
std::string EscapedTo(size_t size) {
    return "\"" + std::string(size - 2, 'x');
}

} // namespace

using NotificationManagerTest = NotifyTest;

TEST_F(NotificationManagerTest, HasNoRulesWithoutARuleFile) {
    NotificationManager manager;
    EXPECT_THAT(Messages(), ElementsAre("Fail to do TORVCFileEnumSection", "Fail to load configuration"));
    EXPECT_FALSE(manager.CheckEps(UINT64_MAX));
    EXPECT_FALSE(manager.CheckSev(SYSLOG_PRIO_EMERG));
    EXPECT_EQ(manager.CheckKeyword("anything"), "");
    EXPECT_EQ(manager.NotificationSendEps(1), 0);
    EXPECT_EQ(NotifyCalls::Sent().at(0).values.at("%TOLERNCE%"), "0");
}

TEST_F(NotificationManagerTest, ChecksEnabledRulesOnly) {
    WriteRules(RuleText("off", 1, "0", "0", "", "0") + RuleText("eps", 1, "0", "5000000000", "") +
               RuleText("sev", 0, "3", "0", "") + RuleText("sev off", 0, "7", "0", "", "0") +
               RuleText("k0", 2, "0", "0", "") + RuleText("k1", 2, "0", "0", "disk", "0") +
               RuleText("k2", 2, "0", "0", "error") + RuleText("k3", 2, "0", "0", "Err") +
               RuleText("k4", 2, "0", "0", "Error") + RuleText("odd", 7, "7", "0", "odd"));
    NotificationManager manager;
    EXPECT_THAT(Messages(), IsEmpty());
    EXPECT_FALSE(manager.CheckEps(4999999999));
    EXPECT_FALSE(manager.CheckEps(4294967296));
    EXPECT_TRUE(manager.CheckEps(5000000000));
    EXPECT_TRUE(manager.CheckEps(UINT64_MAX));
    for (int pri = -1; pri < 9; ++pri)
        EXPECT_EQ(manager.CheckSev(static_cast<_SYSLOG_DB_PRIORITY_tag>(pri)), pri <= 3) << pri;
    EXPECT_EQ(manager.CheckKeyword("disk Error"), "Err");
    EXPECT_EQ(manager.CheckKeyword("Error, error"), "error");
    EXPECT_EQ(manager.CheckKeyword("disk odd e.ror"), "");
}

TEST_F(NotificationManagerTest, LoadsUpToTheFirstBrokenSection) {
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

TEST_F(NotificationManagerTest, ReportsWhichCallOfTheLoadingFailed) {
    WriteRules(RuleText("one", 1, "0", "100", ""));
    struct Case {
        int call;
        std::vector<std::string> messages;
    };
    const Case cases[] = {
        {1, {"Fail to allocate memory", "Fail to load configuration"}},
        {2, {"Fail to do TORVCFileEnumSection", "Fail to load configuration"}},
        {3, {"utils:81 Fail to allocate memory", "Fail to get notification setting one"}},
        {4, {"utils:85 Fail to do TORVCFileGetSection", "Fail to get notification setting one"}},
        {5, {}},
    };
    for (const Case &c : cases) {
        PlatformCalls::FailFrom(c.call, 1);
        EXPECT_EQ(NotificationManager().CheckEps(100), c.messages.empty());
        EXPECT_EQ(Messages(), c.messages);
    }
}

TEST_F(NotificationManagerTest, SendsTheTagAndThePlaceholders) {
    WriteRules(RuleText("first", 1, "0", "500", "", "0") + RuleText("second", 1, "0", "100", ""));
    NotificationManager manager;
    _SYSLOG_LOG_DATA_tag log;
    log.msg = "a \"b\" \\c\n%HOST%";
    for (const int answer : {0, 5}) {
        NotifyCalls::Reset();
        NotifyCalls::AnswerWith(answer);
        EXPECT_TRUE(manager.CheckEps(200));
        EXPECT_EQ(manager.NotificationSendEps(200), 0);
        EXPECT_EQ(manager.NotificationSendVolFull("share"), 0);
        EXPECT_EQ(manager.NotificationSendSev("h", SYSLOG_PRIO_EMERG, log), 0);
        EXPECT_EQ(manager.NotificationSendSev("h", std::string("err"), std::string("text")), 0);
        EXPECT_EQ(manager.NotificationSendKeyword("h", "k", log), 0);
        EXPECT_EQ(manager.NotificationSendKeyword("h", "k", EscapedTo(2046)), 0);
        EXPECT_THAT(
            NotifyCalls::Sent(),
            ElementsAre(
                Sent("KELOSYSLOG_EPS_EXCEED", {{kClassKey, kClass}, {"%EPS%", "200"}, {"%TOLERNCE%", "500"}}),
                Sent("KELOSYSLOG_VOL_FULL", {{kClassKey, kClass}, {"%SHARED_FOLDER%", "share"}}),
                Sent("KELOSYSLOG_SEV_EXCEED", {{kClassKey, kClass},
                                               {"%HOST%", "h"},
                                               {"%SEV%", "emerg"},
                                               {"%SYSLOG_CONTENT%", "a \\\"b\\\" \\\\c\n%HOST%"}}),
                Sent("KELOSYSLOG_SEV_EXCEED",
                     {{kClassKey, kClass}, {"%HOST%", "h"}, {"%SEV%", "err"}, {"%SYSLOG_CONTENT%", "text"}}),
                Sent("KELOSYSLOG_KEYWORD_MATCH", {{kClassKey, kClass},
                                                  {"%HOST%", "h"},
                                                  {"%KEYWORD%", "k"},
                                                  {"%SYSLOG_CONTENT%", "a \\\"b\\\" \\\\c\n%HOST%"}}),
                Sent("KELOSYSLOG_KEYWORD_MATCH", {{kClassKey, kClass},
                                                  {"%HOST%", "h"},
                                                  {"%KEYWORD%", "k"},
                                                  {"%SYSLOG_CONTENT%", "\\" + EscapedTo(2046)}})));
        EXPECT_THAT(Messages(), IsEmpty());
    }
}

TEST_F(NotificationManagerTest, KeepsQuietAboutFailedMailAndRefusesLongContents) {
    WriteRules("");
    NotificationManager manager;
    for (const std::string content : {"Failed to send email.", "a Failed to send email. b"}) {
        EXPECT_EQ(manager.NotificationSendSev("h", "err", content + std::string(3000, 'x')), 0);
        EXPECT_EQ(manager.NotificationSendKeyword("h", "k", content), 0);
    }
    EXPECT_THAT(Messages(), IsEmpty());
    EXPECT_EQ(manager.NotificationSendSev("h", "err", EscapedTo(2048)), -1);
    EXPECT_EQ(manager.NotificationSendKeyword("h", "k", std::string(2048, 'x')), -1);
    EXPECT_THAT(Messages(), ElementsAre("Not enough memory", "Not enough memory"));
    EXPECT_THAT(NotifyCalls::Sent(), IsEmpty());
}

TEST_F(NotificationManagerTest, ReportsEveryFailedCallOfASend) {
    WriteRules("");
    NotificationManager manager;
    struct Case {
        const char *tag;
        std::function<int()> send;
    };
    const Case cases[] = {
        {"KELOSYSLOG_EPS_EXCEED", [&] { return manager.NotificationSendEps(1); }},
        {"KELOSYSLOG_VOL_FULL", [&] { return manager.NotificationSendVolFull("share"); }},
        {"KELOSYSLOG_SEV_EXCEED", [&] { return manager.NotificationSendSev("h", "err", "text"); }},
        {"KELOSYSLOG_KEYWORD_MATCH", [&] { return manager.NotificationSendKeyword("h", "k", "text"); }},
    };
    for (const Case &c : cases) {
        for (int n = 1;; ++n) {
            PlatformCalls::Reset();
            PlatformCalls::FailFrom(n, 1);
            const int result = c.send();
            if (!PlatformCalls::HasFailed()) {
                EXPECT_EQ(result, 0);
                break;
            }
            EXPECT_EQ(result, -1) << n;
            const PlatformCall &failed = PlatformCalls::Recorded().back();
            if (failed.text == kClassKey || failed.function == "KELOSysNotifySendNotificationCustomized")
                EXPECT_THAT(Messages(), ElementsAre(std::string("Fail to send notification: ") + c.tag,
                                                    "Fail to send notification"));
            else
                EXPECT_THAT(Messages(), ElementsAre("Fail to allocation memory"));
            EXPECT_EQ(NotifyCalls::OpenHandles(), 0);
        }
        EXPECT_EQ(NotifyCalls::Sent().size(), 1u);
        NotifyCalls::Reset();
    }
}
