#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kelosyslog/dbhandler.h"
#include "support/log_database.h"
#include "support/notify_calls.h"
#include "support/platform_calls.h"
#include "support/syslog_capture.h"
#include "support/system_calls.h"
#include "support/temp_root.h"

namespace kelo::test {

// A handler on a file below a root of its own. The file is there only where a test creates it.
class DbTest : public testing::Test {
protected:
    DbTest();
    ~DbTest() override;

    // An archive with `logs` sample logs, and the handler connected to it.
    void Connect(int logs = 0);

    // The messages since the last call.
    std::vector<SyslogMessage> Messages();
    // "function argument" of the calls of these functions, in order.
    static std::vector<std::string> Calls(const std::vector<std::string> &functions);

    TempRoot root_;
    SyslogCapture log_;
    const std::string path_ = root_.File("logs.db");
    DBHandler db_{path_, KELO_SOURCE_DIR "/package/schema/archive.sql"};
};

// What a report and a message of other priority look like.
SyslogMessage Error(const std::string &text);
SyslogMessage Info(const std::string &text);

} // namespace kelo::test
