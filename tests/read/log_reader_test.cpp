#include "read/log_reader.h"
#include "support/test.h"

namespace kelo::tool {
namespace {

using Ids = std::vector<uint64_t>;
using test::PlatformCalls;

class LogReaderTest : public testing::Test {
protected:
    LogReaderTest() {
        table_.path = root_.File("logs.db");
        test::CreateLogDatabase(table_.path);
    }

    static Ids Collect(const LogReader &reader, const Page &page, bool oldestFirst) {
        Ids ids;
        size_t told = 0;
        const uint64_t count = reader.ReadPage(
            page, oldestFirst, [&](const _SYSLOG_LOG_DATA_tag &log) { ids.push_back(log.id); },
            [&] {
                EXPECT_EQ(PlatformCalls::OpenHandles(), 0);
                told = ids.size();
            });
        EXPECT_EQ(told, ids.size());
        EXPECT_EQ(count, ids.size());
        return ids;
    }

    test::TempRoot root_;
    LogTable table_;
};

// More rows than one statement reads, ids far apart, and more of them than an int counts.
TEST_F(LogReaderTest, GivesExactPagesAndCountsOverChunksAndGaps) {
    test::RunSql(table_.path,
                 "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 60000) "
                 "INSERT INTO logs(id, host) SELECT i + 99000, 'a' FROM n WHERE i < 59800 OR i % 3;"
                 "INSERT INTO logs(id, host) VALUES (5000000000, 'b'), (9000000000000, 'a')");
    Ids newestFirst = {9000000000000, 5000000000};
    for (uint64_t id = 60000; id > 0; --id) {
        if (id < 59800 || id % 3 != 0)
            newestFirst.push_back(id + 99000);
    }
    const LogReader reader(table_, {});
    for (const uint64_t limit : {0U, 1U, 50U, 10001U, 55000U, 99999U}) {
        for (const uint64_t offset : {0U, 1U, 7U, 186U, 59934U, 59935U, 99999U}) {
            SCOPED_TRACE(std::to_string(limit) + " after " + std::to_string(offset));
            const size_t first = std::min<size_t>(offset, newestFirst.size());
            const size_t count = std::min<size_t>(limit == 0 ? SIZE_MAX : limit, newestFirst.size() - first);
            const auto start = newestFirst.begin() + static_cast<long>(first);
            Ids expected(start, start + static_cast<long>(count));
            EXPECT_TRUE(Collect(reader, {limit, offset}, false) == expected);
            std::reverse(expected.begin(), expected.end());
            EXPECT_TRUE(Collect(reader, {limit, offset}, true) == expected);
        }
    }
    // Between two ids, the first that is left out and the last, from both ends.
    for (const bool fromOldest : {false, true}) {
        for (const uint64_t limit : {0U, 3U, 20000U}) {
            const Page page{limit, 1, {99001, 150000}, fromOldest};
            Ids expected;
            for (uint64_t i = 1; i <= (limit == 0 ? 50999 : limit); ++i)
                expected.push_back(fromOldest ? 99001 + i : 150000 - i);
            EXPECT_TRUE(Collect(reader, page, fromOldest) == expected) << limit;
            std::reverse(expected.begin(), expected.end());
            EXPECT_TRUE(Collect(reader, page, !fromOldest) == expected) << limit;
        }
    }
    PlatformCalls::Reset();
    EXPECT_EQ(reader.Count(), newestFirst.size());
    EXPECT_LT(PlatformCalls::Texts().size(), 20U); // gaps are not searched bit by bit
    const LogReader onHost(table_, {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "a", {}}});
    EXPECT_EQ(onHost.Count(), newestFirst.size() - 1);
    EXPECT_EQ(onHost.IdFromNewest(1), newestFirst[2]);
}

} // namespace
} // namespace kelo::tool
