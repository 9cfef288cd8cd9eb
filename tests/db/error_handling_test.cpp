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

// The text without the source line, which may change.
std::string WithoutLine(const std::string &text) {
    EXPECT_THAT(text, MatchesRegex("dbhandler:[0-9]+ .*"));
    return text.substr(text.find(' ') + 1);
}

TEST_F(DBErrorHandle, ChoosesThePriorityByTheErrorCode) {
    Connect();
    const struct {
        int code;
        bool hasLogs;
        bool isError;
    } cases[] = {
        {SQLITE_ERROR, true, false}, {SQLITE_ERROR, false, true},  {SQLITE_BUSY, false, false},
        {SQLITE_EMPTY, true, false}, {SQLITE_NOTADB, true, false}, {SQLITE_LOCKED, true, true},
        {SQLITE_FULL, true, true},   {SQLITE_IOERR, true, true},
    };
    const std::string sql = "SELECT '100%s %n' FROM gone";
    for (const auto &c : cases) {
        SCOPED_TRACE(c.code);
        injectedCode = 0;
        RunSql(path_, c.hasLogs ? "CREATE TABLE IF NOT EXISTS logs (id)" : "DROP TABLE IF EXISTS logs");
        injectedCode = c.code;
        EXPECT_EQ(db_.DBExecute(sql), -1);
        const auto messages = log_.Take();
        ASSERT_EQ(messages.size(), 1u);
        EXPECT_EQ(messages[0].first, c.isError ? Error("").first : Info("").first);
        EXPECT_EQ(WithoutLine(messages[0].second), "Fail to execute SQL command: " + sql +
                                                       ", error code is : " + std::to_string(c.code) +
                                                       ", error cause: no such table: gone");
    }
    EXPECT_TRUE(fs::exists(path_));
    EXPECT_THAT(PlatformCalls::Sent(), IsEmpty());
}

TEST_F(DBErrorHandle, EndsWhenItsOwnQuestionFails) {
    Connect();
    injectedCode = SQLITE_ERROR;
    PlatformCalls::FailFrom(1);
    EXPECT_EQ(db_.DBExecute("SELECT 1"), -1);
    const auto messages = log_.Take();
    ASSERT_EQ(messages.size(), 3u); // the question, its report, the statement
    EXPECT_EQ(messages[2].first, Error("").first);
    EXPECT_EQ(WithoutLine(messages[2].second).rfind("Fail to execute SQL command: SELECT 1,", 0), 0u);
    EXPECT_EQ(PlatformCalls::Texts().size(), 2u);
}

TEST_F(DBErrorHandle, EndsTheQuarantineWhenTheFileCannotBeRenamed) {
    WriteFile(path_, "damaged");
    fs::create_directory(path_ + ".corrupt");
    EXPECT_EQ(DBErrorHandle_SQLITE_CORRUPT(nullptr, path_), -1);
    EXPECT_THAT(PlatformCalls::Texts({"KELOSystemdReload"}), IsEmpty());
}

} // namespace
} // namespace kelo::test
