#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "kelosyslog/logger.h"
#include "support/log_database.h"
#include "support/platform_calls.h"
#include "support/syslog_capture.h"
#include "support/temp_root.h"

namespace kelo::test {

using Lines = std::vector<std::string>;

// A root of its own with the shipped schema in it. Checks at the end that nothing is left open.
class EventTest : public testing::Test {
protected:
    EventTest();
    ~EventTest() override;

    // Creates the server's database with `rows` events at the times 1000, 1001, 1002, ...
    void CreateEvents(int rows) const;
    std::string Query(const std::string &sql) const { return QueryText(db_, sql); }
    std::string Rows() const { return Query("SELECT count(*) FROM log"); }

    // The system log so far, without what the database handler adds about failed statements; then forgotten.
    Lines Messages();

    TempRoot root_;
    const std::string db_ = root_.File("usr/kelo/etc/kelosyslog.db");
    Logger logger_;

private:
    SyslogCapture log_;
};

} // namespace kelo::test
