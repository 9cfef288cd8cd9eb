#include "notify/notify_fixture.h"

using namespace kelo::test;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

struct Event {
    const char *tag;
    std::map<std::string, std::string> values;
    std::function<int()> send;
};

// A content that a manager would neither send nor let pass unescaped.
constexpr char kContent[] = "\"Failed to send email.\"";
constexpr char kEscaped[] = "\\\"Failed to send email.\\\"";

const Event kEvents[] = {
    {"KELOSYSLOG_ShareRemove", {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareRemove("s"); }},
    {"KELOSYSLOG_ShareRename", {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareRename("s"); }},
    {"KELOSYSLOG_ShareEncMount", {{"%SHARED_FOLDER%", ""}}, [] { return SyslogMailShareEncMount(""); }},
    {"KELOSYSLOG_ShareEncUnmount", {{"%SHARED_FOLDER%", "s"}}, [] { return SyslogMailShareEncUnmount("s"); }},
    {"KELOSYSLOG_SEV_EXCEED",
     {{"%SEV%", "err"}, {"%SYSLOG_CONTENT%", kEscaped}},
     [] { return SyslogMailSeverityExceeded("err", kContent); }},
    {"KELOSYSLOG_KEYWORD_MATCH",
     {{"%KEYWORD%", "k"}, {"%SYSLOG_CONTENT%", kEscaped}},
     [] { return SyslogMailKeywordMatched("k", kContent); }},
};

} // namespace

using MailEvents = NotifyTest;

TEST_F(MailEvents, SendTheirPlaceholdersAndNoClass) {
    for (const int answer : {0, 7}) {
        for (const Event &event : kEvents) {
            NotifyCalls::Reset();
            NotifyCalls::AnswerWith(answer);
            EXPECT_EQ(event.send(), 0);
            EXPECT_THAT(NotifyCalls::Sent(), ElementsAre(Sent(event.tag, event.values)));
        }
    }
    EXPECT_THAT(Messages(), IsEmpty());
}

TEST_F(MailEvents, SayNothingUnlessTheServiceFails) {
    for (const Event &event : kEvents) {
        for (int n = 1;; ++n) {
            PlatformCalls::Reset();
            PlatformCalls::FailFrom(n, 1);
            const int result = event.send();
            if (!PlatformCalls::HasFailed())
                break;
            EXPECT_EQ(result, -1);
            if (PlatformCalls::Recorded().back().function == "KELOSysNotifySendNotificationCustomized")
                EXPECT_THAT(Messages(), ElementsAre(std::string("Fail to send notification: ") + event.tag));
            else
                EXPECT_THAT(Messages(), IsEmpty());
            EXPECT_EQ(NotifyCalls::OpenHandles(), 0);
        }
    }
}

TEST_F(MailEvents, RefuseNullAndLongContentsWithoutAWord) {
    const std::string fits = "\"" + std::string(2045, 'x');
    const std::string tooLong = fits + "x";
    EXPECT_EQ(SyslogMailSeverityExceeded("err", fits.c_str()), 0);
    EXPECT_EQ(NotifyCalls::Sent().size(), 1u);
    EXPECT_EQ(SyslogMailSeverityExceeded("err", tooLong.c_str()), -1);
    EXPECT_EQ(SyslogMailKeywordMatched("k", tooLong.c_str()), -1);
    EXPECT_EQ(SyslogMailSeverityExceeded(nullptr, "c"), -1);
    EXPECT_EQ(SyslogMailKeywordMatched("k", nullptr), -1);
    EXPECT_EQ(SyslogMailShareRemove(nullptr), -1);
    EXPECT_EQ(NotifyCalls::Sent().size(), 1u);
    EXPECT_THAT(Messages(), IsEmpty());
}
