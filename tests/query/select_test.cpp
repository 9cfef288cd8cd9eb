#include "kelosyslog/dbutil.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/log_database.h"
#include "support/platform_calls.h"
#include "support/temp_root.h"

using namespace kelo::test;

namespace {
int Collect(_SYSLOG_LOG_DATA_tag &log, void *context) {
    static_cast<std::vector<uint64_t> *>(context)->push_back(log.id);
    return 0;
}
} // namespace

TEST(SyslogDBSelect, TakesAnUnfilteredPageById) {
    TempRoot root;
    CreateLogDatabase(root.File("l.db"));
    InsertSampleLogs(root.File("l.db"), 100);
    PlatformCalls::Reset();
    _SYSLOG_SQL_LIMIT_tag page{3, 2};
    _SYSLOG_SQL_ORDER_tag order{0, SYSLOG_ATTRI_ID};
    std::vector<uint64_t> ids;
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    LogSearchCondListGen("any", "", "", "", "*", "", "", conditions);
    EXPECT_EQ(SyslogDBSelect(root.File("l.db"), conditions, &page, &order, Collect, &ids, false), 0);
    EXPECT_THAT(ids, testing::ElementsAre(98, 97, 96));
    EXPECT_EQ(SyslogDBSelectCount(root.File("l.db"), conditions, nullptr, &order), 100);
    LogSearchCondListGen("host01,host02", "", "", "", "", "", "", conditions);
    EXPECT_EQ(SyslogDBSelectCount(root.File("l.db"), conditions, nullptr, nullptr), 4);
    EXPECT_EQ(SyslogDBDelete(root.File("l.db"), conditions), 0);
    EXPECT_EQ(SyslogDBSelectCount(root.File("l.db"), conditions, nullptr, nullptr), 0);
    EXPECT_EQ(PlatformCalls::OpenConnections(), 0);
    EXPECT_EQ(PlatformCalls::OpenResults(), 0);
}
