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

    // The messages since the last call; behind "<N>" where the priority is not that of an error.
    std::vector<std::string> Take() {
        std::vector<std::string> messages;
        for (const auto &[priority, text] : log_.Take())
            messages.push_back((priority == LOG_ERR ? "" : "<" + std::to_string(priority) + ">") + text);
        return messages;
    }

    const std::string path_ = root_.File("logs.db");
    DBHandler db_{path_, BuildPath("package/schema/archive.sql")};
};

} // namespace kelo::test
