// What the manager and the mail events send, and where the two differ.

#include "notify/notify_fixture.h"

using namespace kelo::test;

namespace {

constexpr char kClassKey[] = "DESKTOP_NOTIFY_CLASSNAME";
constexpr char kClass[] = "KELO.ZRT.Quillbay.BuiltIn";
constexpr char kContent[] = "a \"b\" \\c\n%HOST%";
constexpr char kEscaped[] = "a \\\"b\\\" \\\\c\n%HOST%";

// A content whose escaped form has `size` bytes.
std::string EscapedTo(size_t size) {
    return "\"" + std::string(size - 2, 'x');
}

class NotificationSends : public NotifyTest {
protected:
    struct Send {
        const char *tag;
        std::map<std::string, std::string> values; // with the class for the manager's
        std::function<int()> run;
    };

    NotificationSends() {
        WriteRules(RuleText("first", 1, "0", "500", "", "0") + RuleText("second", 1, "0", "100", ""));
        manager_.ConfigLoad(RulePath());
        Messages();
        log_.msg = kContent;
    }

    _SYSLOG_LOG_DATA_tag log_;
    NotificationManager manager_;
    const std::vector<Send> sends_ = {
        {"KELOSYSLOG_EPS_EXCEED",
         {{kClassKey, kClass}, {"%EPS%", "200"}, {"%TOLERNCE%", "500"}},
         [this] { return manager_.NotificationSendEps(200); }},
        {"KELOSYSLOG_VOL_FULL",
         {{kClassKey, kClass}, {"%SHARED_FOLDER%", "s"}},
         [this] { return manager_.NotificationSendVolFull("s"); }},
        {"KELOSYSLOG_SEV_EXCEED",
         {{kClassKey, kClass}, {"%HOST%", "h"}, {"%SEV%", "emerg"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [this] { return manager_.NotificationSendSev("h", SYSLOG_PRIO_EMERG, log_); }},
        {"KELOSYSLOG_KEYWORD_MATCH",
         {{kClassKey, kClass}, {"%HOST%", "h"}, {"%KEYWORD%", "k"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [this] { return manager_.NotificationSendKeyword("h", "k", log_); }},
        {"KELOSYSLOG_ShareRemove", {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareRemove("s"); }},
        {"KELOSYSLOG_ShareRename", {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareRename("s"); }},
        {"KELOSYSLOG_ShareEncMount", {{"%SHARED_FOLDER%", ""}}, [] { return SyslogMailShareEncMount(""); }},
        {"KELOSYSLOG_ShareEncUnmount",
         {{"%SHARED_FOLDER%", "s"}},
         [] { return SyslogMailShareEncUnmount("s"); }},
        {"KELOSYSLOG_SEV_EXCEED",
         {{"%SEV%", "err"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [] { return SyslogMailSeverityExceeded("err", kContent); }},
        {"KELOSYSLOG_KEYWORD_MATCH",
         {{"%KEYWORD%", "k"}, {"%SYSLOG_CONTENT%", kEscaped}},
         [] { return SyslogMailKeywordMatched("k", kContent); }},
    };
};

} // namespace

TEST_F(NotificationSends, CarryTheTagAndThePlaceholdersWhateverTheServiceAnswers) {
    for (const int answer : {0, 7}) {
        for (const Send &send : sends_) {
            NotifyCalls::Reset();
            NotifyCalls::AnswerWith(answer);
            EXPECT_EQ(send.run(), 0);
            EXPECT_THAT(NotifyCalls::Sent(), ElementsAre(Sent(send.tag, send.values)));
        }
    }
    EXPECT_THAT(Messages(), IsEmpty());
}

TEST_F(NotificationSends, ReportEveryFailedCallOfTheManagerButOnlyTheServicesOfAMailEvent) {
    for (const Send &send : sends_) {
        const std::string failure = std::string("Fail to send notification: ") + send.tag;
        for (int n = 1;; ++n) {
            PlatformCalls::Reset();
            PlatformCalls::FailFrom(n, 1);
            const int result = send.run();
            if (!PlatformCalls::HasFailed())
                break;
            EXPECT_EQ(result, -1) << n;
            const PlatformCall &failed = PlatformCalls::Recorded().back();
            const bool isService = failed.function == "KELOSysNotifySendNotificationCustomized";
            if (!send.values.contains(kClassKey))
                EXPECT_EQ(Messages(), isService ? std::vector{failure} : std::vector<std::string>());
            else if (isService || failed.text == kClassKey)
                EXPECT_THAT(Messages(), ElementsAre(failure, "Fail to send notification"));
            else
                EXPECT_THAT(Messages(), ElementsAre("Fail to allocation memory"));
            EXPECT_EQ(NotifyCalls::OpenHandles(), 0);
        }
    }
}

TEST_F(NotificationSends, RefuseLongContentsAndTheManagerThoseOfFailedMail) {
    const std::string failedMail = "a Failed to send email. b";
    EXPECT_EQ(manager_.NotificationSendSev("h", "err", failedMail + std::string(3000, 'x')), 0);
    EXPECT_EQ(manager_.NotificationSendKeyword("h", "k", failedMail), 0);
    EXPECT_EQ(NotifyCalls::Sent().size(), 0u);
    EXPECT_EQ(SyslogMailKeywordMatched("k", failedMail.c_str()), 0);
    EXPECT_EQ(manager_.NotificationSendKeyword("h", "k", EscapedTo(2047)), 0);
    EXPECT_EQ(SyslogMailSeverityExceeded("err", EscapedTo(2047).c_str()), 0);
    EXPECT_EQ(NotifyCalls::Sent().size(), 3u);
    EXPECT_EQ(SyslogMailSeverityExceeded("err", EscapedTo(2048).c_str()), -1);
    EXPECT_EQ(SyslogMailKeywordMatched("k", nullptr), -1);
    EXPECT_EQ(SyslogMailShareRemove(nullptr), -1);
    EXPECT_THAT(Messages(), IsEmpty());
    EXPECT_EQ(manager_.NotificationSendSev("h", "err", EscapedTo(2048)), -1);
    EXPECT_EQ(manager_.NotificationSendKeyword("h", "k", std::string(2048, 'x')), -1);
    EXPECT_THAT(Messages(), ElementsAre("Not enough memory", "Not enough memory"));
    EXPECT_EQ(NotifyCalls::Sent().size(), 3u);
}
