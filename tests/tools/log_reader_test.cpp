#include "log_reader.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "support/log_database.h"
#include "support/platform_calls.h"
#include "support/temp_root.h"

namespace kelo::tool {
namespace {

using Ids = std::vector<uint64_t>;
using test::PlatformCalls;

class LogReaderTest : public testing::Test {
protected:
    LogReaderTest() {
        source_.path = root_.File("logs.db");
        test::CreateLogDatabase(source_.path);
    }

    static Ids Collect(const LogReader &reader, const Page &page, bool oldestFirst) {
        Ids ids;
        const uint64_t count = reader.WalkPage(
            page, oldestFirst, [&](const _SYSLOG_LOG_DATA_tag &log) { ids.push_back(log.id); });
        EXPECT_EQ(count, ids.size());
        return ids;
    }

    test::TempRoot root_;
    LogSource source_;
};

TEST_F(LogReaderTest, GivesExactPagesAndCountsAfterDeletions) {
    test::InsertSampleLogs(source_.path, 300);
    test::RunSql(source_.path, "DELETE FROM logs WHERE id % 3 = 0 OR id > 280");
    Ids newestFirst;
    for (uint64_t id = 280; id > 0; --id) {
        if (id % 3 != 0)
            newestFirst.push_back(id);
    }
    const LogReader reader(source_, {});
    EXPECT_EQ(reader.Count(), newestFirst.size());
    for (const uint64_t limit : {0U, 1U, 50U, 1000U, 60000U}) {
        for (const uint64_t offset : {0U, 1U, 7U, 186U, 187U, 500U}) {
            SCOPED_TRACE(std::to_string(limit) + " after " + std::to_string(offset));
            Ids expected(newestFirst.begin() +
                             static_cast<long>(std::min<size_t>(offset, newestFirst.size())),
                         newestFirst.end());
            if (limit != 0)
                expected.resize(std::min<size_t>(limit, expected.size()));
            EXPECT_EQ(Collect(reader, {limit, offset}, false), expected);
            std::reverse(expected.begin(), expected.end());
            EXPECT_EQ(Collect(reader, {limit, offset}, true), expected);
        }
    }
}

// More rows than one statement reads, ids far apart, and more of them than an int counts.
TEST_F(LogReaderTest, WalksAndCountsOverChunksAndGaps) {
    test::RunSql(source_.path,
                 "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 60000) "
                 "INSERT INTO logs(id, host) SELECT i + 99000, 'a' FROM n;"
                 "INSERT INTO logs(id, host) VALUES (5000000000, 'b'), (9000000000000, 'a')");
    Ids expected;
    for (uint64_t id = 99001; id <= 159000; ++id)
        expected.push_back(id);
    expected.insert(expected.end(), {5000000000, 9000000000000});
    EXPECT_EQ(Collect(LogReader(source_, {}), {}, true), expected);
    const Ids part = Collect(LogReader(source_, {}), {55000, 2}, true);
    EXPECT_EQ(part, Ids(expected.end() - 55002, expected.end() - 2));
    EXPECT_EQ(Collect(LogReader(source_, {}), {55000, 2}, false), Ids(part.rbegin(), part.rend()));
    const LogReader onHost(source_, {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "a", {}}});
    EXPECT_EQ(onHost.Count(), 60001U);
    EXPECT_EQ(onHost.IdFromNewest(1), 159000U);
    PlatformCalls::Reset();
    EXPECT_EQ(LogReader(source_, {}).Count(), 60002U);
    EXPECT_LT(PlatformCalls::Statements().size(), 20U); // gaps are not searched bit by bit
}

} // namespace
} // namespace kelo::tool
