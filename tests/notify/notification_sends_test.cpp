// What the manager and the mail events send, and where the two differ.

#include "notify/notify_fixture.h"

namespace kelo::test {
namespace {

constexpr char kClassKey[] = "DESKTOP_NOTIFY_CLASSNAME";
constexpr char kContent[] = "a \"b\" \\c\n%HOST%";
constexpr char kEscaped[] = "a \\\"b\\\" \\\\c\n%HOST%";

// A content whose escaped form has `size` bytes.
std::string EscapedTo(size_t size) {
    return "\"" + std::string(size - 2, 'x');
}

class NotificationSends : public NotifyTest {
protected:
    struct Send {
        std::string tag; // behind "KELOSYSLOG_"
        bool isManagers; // which sends the class too
        std::map<std::string, std::string> values;
        std::function<int()> run;
    };

    NotificationSends() {
        WriteRules(RuleText("first", 1, "0", "500", "", "0") + RuleText("second", 1, "0", "100", ""));
        manager_.ConfigLoad(rules_);
        TakeTexts();
        log_.msg = kContent;
    }

    _SYSLOG_LOG_DATA_tag log_;
    NotificationManager manager_;
    const std::vector<Send> sends_ = {
        {"EPS_EXCEED",
         true,
         {{"%EPS%", "200"}, {"%TOLERNCE%", "500"}},
         [&] { return manager_.NotificationSendEps(200); }},
        {"VOL_FULL", true, {{"%SHARED_FOLDER%", "s"}}, [&] { return manager_.NotificationSendVolFull("s"); }},
        {"SEV_EXCEED",
         true,
         {{"%HOST%", "h"}, {"%SEV%", "emerg"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [&] { return manager_.NotificationSendSev("h", SYSLOG_PRIO_EMERG, log_); }},
        {"KEYWORD_MATCH",
         true,
         {{"%HOST%", "h"}, {"%KEYWORD%", "k"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [&] { return manager_.NotificationSendKeyword("h", "k", log_); }},
        {"ShareRemove", false, {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareRemove("s"); }},
        {"ShareRename", false, {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareRename("s"); }},
        {"ShareEncMount", false, {{"%SHARED_FOLDER%", ""}}, [] { return SyslogMailShareEncMount(""); }},
        {"ShareEncUnmount", false, {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareEncUnmount("s"); }},
        {"SEV_EXCEED",
         false,
         {{"%SEV%", "err"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [] { return SyslogMailSeverityExceeded("err", kContent); }},
        {"KEYWORD_MATCH",
         false,
         {{"%KEYWORD%", "k"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [] { return SyslogMailKeywordMatched("k", kContent); }},
    };
};

TEST_F(NotificationSends, CarryTheTagAndThePlaceholdersWhateverTheServiceAnswers) {
    for (const int answer : {0, 7}) {
        for (const Send &send : sends_) {
            PlatformCalls::Reset();
            PlatformCalls::answers.notification = answer;
            EXPECT_EQ(send.run(), 0);
            SentNotification sent{"KELOSYSLOG_" + send.tag,
                                  root_.File("usr/kelo/keloman/webman/modules/Quillbay/texts/"),
                                  root_.File("etc/kelosyslog/notify.filter"), send.values};
            if (send.isManagers)
                sent.values[kClassKey] = "KELO.ZRT.Quillbay.BuiltIn";
            EXPECT_EQ(PlatformCalls::Sent(), std::vector{sent}) << send.tag;
        }
    }
    EXPECT_THAT(TakeTexts(), IsEmpty());
}

TEST_F(NotificationSends, ReportEveryFailedCallOfTheManagerButOnlyTheServicesOfAMailEvent) {
    for (const Send &send : sends_) {
        const std::string failure = "Fail to send notification: KELOSYSLOG_" + send.tag;
        for (int n = 1;; ++n) {
            PlatformCalls::Reset();
            PlatformCalls::FailFrom(n, 1);
            const int result = send.run();
            if (!PlatformCalls::HasFailed())
                break;
            EXPECT_EQ(result, -1) << n;
            const PlatformCall &failed = PlatformCalls::Recorded().back();
            const bool isService = failed.function == "KELOSysNotifySendNotificationCustomized";
            std::vector<std::string> expected;
            if (isService || (send.isManagers && failed.text == kClassKey))
                expected = {failure};
            if (send.isManagers)
                expected.push_back(expected.empty() ? "Fail to allocation memory"
                                                    : "Fail to send notification");
            EXPECT_EQ(TakeTexts(), expected);
        }
    }
}

TEST_F(NotificationSends, RefuseLongContentsAndTheManagerThoseOfFailedMail) {
    const std::string failedMail = "a Failed to send email. b";
    EXPECT_EQ(manager_.NotificationSendSev("h", "err", failedMail + std::string(3000, 'x')), 0);
    EXPECT_EQ(manager_.NotificationSendKeyword("h", "k", failedMail), 0);
    EXPECT_EQ(PlatformCalls::Sent().size(), 0u);
    EXPECT_EQ(SyslogMailKeywordMatched("k", failedMail.c_str()), 0);
    EXPECT_EQ(manager_.NotificationSendKeyword("h", "k", EscapedTo(2047)), 0);
    EXPECT_EQ(SyslogMailSeverityExceeded("err", EscapedTo(2047).c_str()), 0);
    EXPECT_EQ(PlatformCalls::Sent().size(), 3u);
    EXPECT_EQ(SyslogMailSeverityExceeded("err", EscapedTo(2048).c_str()), -1);
    EXPECT_EQ(SyslogMailKeywordMatched("k", nullptr), -1);
    EXPECT_EQ(SyslogMailShareRemove(nullptr), -1);
    EXPECT_THAT(TakeTexts(), IsEmpty());
    EXPECT_EQ(manager_.NotificationSendSev("h", "err", EscapedTo(2048)), -1);
    EXPECT_EQ(manager_.NotificationSendKeyword("h", "k", std::string(2048, 'x')), -1);
    EXPECT_THAT(TakeTexts(), ElementsAre("Not enough memory", "Not enough memory"));
    EXPECT_EQ(PlatformCalls::Sent().size(), 3u);
}

} // namespace
} // namespace kelo::test
