#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <list>
#include <string>
#include <vector>

#include "kelosyslog/dbutil.h"
#include "support/log_database.h"
#include "support/platform_calls.h"
#include "support/syslog_capture.h"
#include "support/temp_root.h"

namespace kelo::test {

using Conditions = std::list<_SYSLOG_SQL_COND_tag>;

// A log database, and the checks that hold after every call: nothing stays open.
class QueryTest : public testing::Test {
protected:
    QueryTest() {
        CreateLogDatabase(path_);
        PlatformCalls::Reset();
    }
    void TearDown() override {
        EXPECT_EQ(PlatformCalls::OpenConnections(), 0);
        EXPECT_EQ(PlatformCalls::OpenResults(), 0);
    }
    // The SQL text of the only statement since the last call of this function.
    static std::string TakeStatement() {
        const std::vector<std::string> statements = PlatformCalls::Statements();
        PlatformCalls::Reset();
        return statements.size() == 1 ? statements[0] : std::to_string(statements.size()) + " statements";
    }

    TempRoot root_;
    SyslogCapture log_;
    const std::string path_ = root_.File("logs.db");
};

} // namespace kelo::test
