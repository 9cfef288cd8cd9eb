// Searches on a connection that the program keeps.

#include "kelosyslog/dbreader.h"

#include "kelosyslog/failure.h"
#include "query/query_fixture.h"

namespace kelo::test {
namespace {

using Ids = std::vector<uint64_t>;

int TakeId(_SYSLOG_LOG_DATA_tag &log, void *context) {
    static_cast<Ids *>(context)->push_back(log.id);
    return 0;
}

class Reader : public QueryTest {
protected:
    Reader() { InsertSampleLogs(path_, 300); }

    Ids Select(const Conditions &conditions, _SYSLOG_SQL_LIMIT_tag page) {
        Ids ids;
        EXPECT_EQ(reader_.Select(conditions, &page, nullptr, TakeId, &ids, false), 0);
        return ids;
    }
    int Count(const Conditions &conditions = {}) { return reader_.SelectCount(conditions, nullptr, nullptr); }

    SyslogDBReader reader_{path_};
};

TEST_F(Reader, AsksAndAnswersAsTheFunctionsThatConnectThemselves) {
    const Conditions fromHost3 = {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "host03", {}}};
    for (int round = 0; round < 3; ++round) { // statements are kept from the first one on
        for (const Conditions &conditions : {Conditions{}, fromHost3}) {
            for (_SYSLOG_SQL_LIMIT_tag page : {_SYSLOG_SQL_LIMIT_tag{3, 0}, {3, 2}, {0, 0}, {250, 1}}) {
                PlatformCalls::Reset();
                Ids ids;
                SyslogDBSelect(path_, conditions, &page, nullptr, TakeId, &ids, false);
                const std::string statement = TakeStatement();
                EXPECT_FALSE(ids.empty());
                EXPECT_EQ(Select(conditions, page), ids);
                EXPECT_EQ(TakeStatement(), statement);
            }
            EXPECT_EQ(Count(conditions), SyslogDBSelectCount(path_, conditions, nullptr, nullptr));
        }
    }
    EXPECT_EQ(SyslogDBReader("logs.db").SelectCount({}, nullptr, nullptr), -1);
    EXPECT_EQ(SyslogDBReader(root_.File("none")).SelectCount({}, nullptr, nullptr), -1);
    EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_MISSING);
}

TEST_F(Reader, SeesOneStateInASnapshot) {
    {
        const SyslogDBSnapshot snapshot(reader_);
        EXPECT_TRUE(snapshot.IsTaken());
        EXPECT_FALSE(SyslogDBSnapshot(reader_).IsTaken());
        EXPECT_EQ(Count(), 300);
        InsertSampleLogs(path_, 10);
        EXPECT_EQ(Count(), 300);
        EXPECT_EQ(Select({}, {1, 0}), Ids{300});
    }
    EXPECT_EQ(Count(), 310);
    EXPECT_EQ(reader_.SnapshotEnd(), -1);
}

TEST_F(Reader, FollowsItsPathAndItsTable) {
    EXPECT_EQ(Count(), 300);
    EXPECT_EQ(Select({}, {1, 0}), Ids{300});
    RunSql(path_, "ALTER TABLE logs DROP COLUMN ip; ALTER TABLE logs RENAME COLUMN tag TO label");
    const auto isWhole = [](_SYSLOG_LOG_DATA_tag &log, void *) {
        EXPECT_TRUE(log.ip.empty() && log.tag.empty() && log.prog.starts_with("prog")) << log.prog;
        return 0;
    };
    const _SYSLOG_SQL_LIMIT_tag page{1, 0};
    EXPECT_EQ(reader_.Select({}, &page, nullptr, isWhole, nullptr, false), 0);
    fs::rename(path_, root_.File("aside.db"));
    EXPECT_EQ(Count(), -1);
    CreateLogDatabase(path_);
    InsertSampleLogs(path_, 7);
    EXPECT_EQ(Count(), 7);
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(Count(), -1);
    EXPECT_EQ(Count(), 7);
}

TEST(Clause, IsWhatTheStatementsHave) {
    Conditions conditions;
    LogSearchCondListGen("nas,it's", "err", "", "", "", "", "", conditions);
    std::string clause = "id > 5 AND ";
    EXPECT_EQ(LogSearchClauseGet(conditions, clause), 0);
    EXPECT_EQ(clause, "id > 5 AND ((host = 'nas') OR (host = 'it''s')) AND (llevel = 'err')");
    conditions.front().value = std::string("a\0b", 3);
    EXPECT_EQ(LogSearchClauseGet(conditions, clause), -1);
    EXPECT_THAT(clause, testing::EndsWith("(llevel = 'err')"));
}

} // namespace
} // namespace kelo::test
