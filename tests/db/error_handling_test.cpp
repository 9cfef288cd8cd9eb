#include "db/db_fixture.h"
#include "kelosyslog/notification.h"
#include "support/doubles.h"

namespace {

int injectedCode = 0; // 0 for SQLite's own

} // namespace

extern "C" int sqlite3_errcode(sqlite3 *db) {
    static const auto real = kelo::test::Real<&sqlite3_errcode>("sqlite3_errcode");
    return injectedCode != 0 ? injectedCode : real(db);
}

namespace kelo::test {
namespace {

class DBErrorHandle : public DbTest {
protected:
    ~DBErrorHandle() override { injectedCode = 0; }
};

TEST_F(DBErrorHandle, ChoosesThePriorityByTheErrorCode) {
    Connect();
    const std::string sql = "SELECT '100%s %n' FROM gone";
    for (const auto &[code, hasLogs, isError] : {std::tuple(SQLITE_ERROR, true, false),
                                                 {SQLITE_ERROR, false, true},
                                                 {SQLITE_BUSY, false, false},
                                                 {SQLITE_EMPTY, true, false},
                                                 {SQLITE_NOTADB, true, false},
                                                 {SQLITE_LOCKED, true, true},
                                                 {SQLITE_FULL, true, true},
                                                 {SQLITE_IOERR, true, true}}) {
        injectedCode = 0;
        RunSql(path_, hasLogs ? "CREATE TABLE IF NOT EXISTS logs (id)" : "DROP TABLE IF EXISTS logs");
        injectedCode = code;
        EXPECT_EQ(db_.DBExecute(sql), -1);
        EXPECT_THAT(Take(),
                    ElementsAre(MatchesRegex(
                        (isError ? "" : "<6>") + ("dbhandler:[0-9]+ Fail to execute SQL command: " + sql) +
                        ", error code is : " + std::to_string(code) + ", error cause: no such table: gone")));
    }
    EXPECT_TRUE(fs::exists(path_));
    EXPECT_THAT(PlatformCalls::Sent(), IsEmpty());
}

TEST_F(DBErrorHandle, EndsWhenItsOwnQuestionFails) {
    Connect();
    injectedCode = SQLITE_ERROR;
    PlatformCalls::FailFrom(1);
    EXPECT_EQ(db_.DBExecute("SELECT 1"), -1);
    // The question, its report, the statement.
    EXPECT_THAT(Take(),
                ElementsAre(testing::_, testing::_,
                            MatchesRegex("dbhandler:[0-9]+ Fail to execute SQL command: SELECT 1,.*")));
    EXPECT_EQ(PlatformCalls::Texts().size(), 2u);
}

} // namespace
} // namespace kelo::test
