#pragma once

#include "kelosyslog/dbhandler.h"
#include "support/test.h"

namespace kelo::test {

// A handler on a file below a root of its own. The file is there only where a test creates it.
class DbTest : public LibraryTest {
protected:
    ~DbTest() override { db_.DBDiscon(); }

    // An archive with `logs` sample logs, and the handler connected to it.
    void Connect(int logs = 0) {
        CreateLogDatabase(path_, "archive.sql");
        InsertSampleLogs(path_, logs);
        ASSERT_EQ(db_.DBCon(), 0);
        PlatformCalls::Reset();
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
