#pragma once

#include "kelosyslog/dbhandler.h"
#include "support/notify_calls.h"
#include "support/source_dir.h"
#include "support/system_calls.h"
#include "support/test.h"

namespace kelo::test {

// A handler on a file below a root of its own. The file is there only where a test creates it.
class DbTest : public LibraryTest {
protected:
    DbTest() {
        NotifyCalls::Reset();
        SystemCalls::Reset();
    }
    ~DbTest() override { db_.DBDiscon(); }

    // An archive with `logs` sample logs, and the handler connected to it.
    void Connect(int logs = 0) {
        CreateLogDatabase(path_, "archive.sql");
        InsertSampleLogs(path_, logs);
        ASSERT_EQ(db_.DBCon(), 0);
        PlatformCalls::Reset();
    }

    // The messages since the last call.
    std::vector<SyslogMessage> Messages() {
        const std::vector<SyslogMessage> messages = log_.Messages();
        log_.Clear();
        return messages;
    }
    // "function argument" of the calls of these functions, in order.
    static std::vector<std::string> Calls(const std::set<std::string> &functions) {
        std::vector<std::string> calls;
        for (const PlatformCall &call : PlatformCalls::Recorded()) {
            if (functions.contains(call.function))
                calls.push_back(call.function + " " + call.text);
        }
        return calls;
    }

    const std::string path_ = root_.File("logs.db");
    DBHandler db_{path_, BuildPath("package/schema/archive.sql")};
};

// What a report and a message of other priority look like.
inline SyslogMessage Error(const std::string &text) {
    return {LOG_ERR, text};
}
inline SyslogMessage Info(const std::string &text) {
    return {LOG_INFO, text};
}

} // namespace kelo::test
