#include <sys/resource.h>

#include "db/db_fixture.h"
#include "keloplatform/kelodb.h"

namespace kelo::test {
namespace {

const std::string kSchema = BuildPath("package/schema/archive.sql");

using DBHandlerTest = DbTest;

TEST_F(DBHandlerTest, LeavesNothingWhenTheToolIsKilled) {
    rlimit before{};
    getrlimit(RLIMIT_FSIZE, &before);
    const rlimit tight{16384, before.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &tight), 0);
    EXPECT_EQ(db_.DBCon(), -1);
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &before), 0);
    EXPECT_THAT(Take(), ElementsAre("Fail to create database: " + path_ + "," + kSchema,
                                    "Fail to create database: " + path_));
    EXPECT_FALSE(fs::exists(path_));
    ASSERT_EQ(db_.DBCon(), 0);
    EXPECT_TRUE(db_.DBcheckTableExist("logs"));
}

TEST_F(DBHandlerTest, ConnectsOnceAtATimeAndAgainAfterwards) {
    Connect();
    EXPECT_EQ(db_.DBCon(), -1);
    EXPECT_TRUE(db_.isConnected());
    EXPECT_THAT(Take(), ElementsAre("Connection is already existed"));
    EXPECT_EQ(db_.DBDiscon(), 0);
    EXPECT_FALSE(db_.isConnected());
    EXPECT_EQ(db_.DBDiscon(), 0);
    EXPECT_EQ(db_.DBCon(), 0);
    EXPECT_THAT(PlatformCalls::Texts({"KELOFSMkdirP", "TORVCExec"}), IsEmpty());
}

TEST_F(DBHandlerTest, HandsTheResultToTheCallbackWhateverItReturns) {
    const auto keep = [](DBResult_tag *result, void *context) {
        static_cast<std::vector<int> *>(context)->push_back(result != nullptr ? KELODBNumRows(result) : -1);
        return -1;
    };
    std::vector<int> rows;
    EXPECT_EQ(db_.DBExecute("SELECT 1", keep, &rows), -1);
    EXPECT_THAT(Take(), ElementsAre("DB is not connected"));
    EXPECT_EQ(db_.DBExecute("SELECT 1"), -1);
    EXPECT_THAT(Take(), IsEmpty());
    Connect(3);
    EXPECT_EQ(db_.DBExecute("SELECT * FROM logs", keep, &rows), 0);
    EXPECT_EQ(db_.DBExecute("DELETE FROM logs WHERE id = 1", keep, &rows), 0);
    EXPECT_EQ(db_.DBExecute("SELECT * FROM logs", nullptr, nullptr), 0);
    EXPECT_EQ(db_.DBExecute("SELECT * FROM nothing", keep, &rows), -1);
    const std::string cut("DELETE FROM logs\0 WHERE id = 2", 31);
    EXPECT_EQ(db_.DBExecute(cut), -1);
    EXPECT_EQ(db_.DBExecute(cut, nullptr, nullptr), -1);
    EXPECT_THAT(rows, ElementsAre(3, -1));
    EXPECT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), "2");
}

TEST_F(DBHandlerTest, KeepsTheStateOfItsTransaction) {
    using Member = int (DBHandler::*)();
    const Member start = &DBHandler::DBTranStart;
    const Member end = &DBHandler::DBTranEnd;
    const Member rollback = &DBHandler::DBTranRollback;
    const auto insane = [](const std::string &name) { return "Fail to check sanity (DBTran" + name + ")"; };
    Connect();
    // Each step with the flag after it; `fails` is a failure of SQLite, which is no business of
    // DBErrorHandle.
    const std::tuple<Member, bool, int, int, std::string> steps[] = {
        {end, false, -1, 0, insane("End")},
        {rollback, false, -1, 0, insane("Rollback")},
        {start, true, -1, 0, "Fail to begin transaction"},
        {start, false, 0, 1, ""},
        {start, false, -1, 1, insane("Start")},
        {end, true, -1, 1, "Fail to end transaction"},
        {rollback, true, -1, 1, "Fail to rollback transaction"},
        {end, false, 0, 0, ""},
        {start, false, 0, 1, ""},
        {rollback, false, 0, 0, ""},
        {start, false, 0, 1, ""},
    };
    for (const auto &[run, fails, result, flag, message] : steps) {
        PlatformCalls::FailFrom(1, fails ? 1 : 0);
        EXPECT_EQ((db_.*run)(), result);
        EXPECT_EQ(db_.isInTran(), flag);
        EXPECT_EQ(Take(), std::vector<std::string>(message.empty() ? 0 : 1, message));
    }
    EXPECT_THAT(PlatformCalls::Texts(), ElementsAre("BEGIN;", "BEGIN;", "END;", "ROLLBACK;", "END;", "BEGIN;",
                                                    "ROLLBACK;", "BEGIN;"));
    db_.DBDiscon();
    EXPECT_EQ(db_.isInTran(), 1) << "only the three operations change it";
}

TEST_F(DBHandlerTest, EscapesChecksTablesAndCheckpoints) {
    Connect();
    EXPECT_EQ(db_.DBCmdEscape(std::string("a\0b", 3)), "");
    EXPECT_THAT(Take(), ElementsAre("Fail to escapse string"));
    EXPECT_FALSE(db_.DBcheckTableExist("it's"));
    EXPECT_EQ(Take().back(), "Fail to execute SQL command : SELECT count(*) as count_result FROM "
                             "sqlite_master WHERE type='table' AND name='it's'");

    InsertLogsIntoWal(path_, {SampleLog(1)});
    EXPECT_EQ(db_.DBWalCheckpoint(false), 0);
    EXPECT_TRUE(fs::exists(path_ + "-wal"));
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(db_.DBWalCheckpoint(true), -1);
    EXPECT_TRUE(fs::exists(path_ + "-wal"));
    EXPECT_THAT(Take(), ElementsAre("Fail to force WAL checkpoint(FULL)"));
    for (int i = 0; i < 2; ++i) // the second time there is nothing to remove
        EXPECT_EQ(db_.DBWalCheckpoint(true), 0);
    EXPECT_FALSE(fs::exists(path_ + "-wal") || fs::exists(path_ + "-shm"));
    db_.DBDiscon();
    EXPECT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), "1");
    EXPECT_EQ(db_.DBWalCheckpoint(false), -1);
}

} // namespace
} // namespace kelo::test
