#include "db/db_fixture.h"

#include <syslog.h>

#include <algorithm>

#include "keloplatform/root.h"
#include "kelosyslog/root.h"

namespace kelo::test {

DbTest::DbTest() {
    SyslogRootSet(root_.Path());
    KELORootSet(root_.Path().c_str());
    PlatformCalls::Reset();
    NotifyCalls::Reset();
    SystemCalls::Reset();
}

DbTest::~DbTest() {
    db_.DBDiscon();
    EXPECT_EQ(PlatformCalls::OpenConnections(), 0);
    EXPECT_EQ(PlatformCalls::OpenResults(), 0);
    EXPECT_EQ(NotifyCalls::OpenHandles(), 0);
    SyslogRootSet("");
    KELORootSet("");
}

void DbTest::Connect(int logs) {
    CreateLogDatabase(path_, "archive.sql");
    InsertSampleLogs(path_, logs);
    ASSERT_EQ(db_.DBCon(), 0);
    PlatformCalls::Reset();
}

std::vector<SyslogMessage> DbTest::Messages() {
    const std::vector<SyslogMessage> messages = log_.Messages();
    log_.Clear();
    return messages;
}

std::vector<std::string> DbTest::Calls(const std::vector<std::string> &functions) {
    std::vector<std::string> calls;
    for (const PlatformCall &call : PlatformCalls::Recorded()) {
        if (std::find(functions.begin(), functions.end(), call.function) != functions.end())
            calls.push_back(call.function + " " + call.text);
    }
    return calls;
}

SyslogMessage Error(const std::string &text) {
    return {LOG_ERR, text};
}

SyslogMessage Info(const std::string &text) {
    return {LOG_INFO, text};
}

} // namespace kelo::test
