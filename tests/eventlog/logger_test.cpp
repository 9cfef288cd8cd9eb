#include <fnmatch.h>

#include "kelosyslog/logger.h"
#include "support/test.h"

namespace kelo::test {
namespace {

// A root with the shipped schema in it.
class LoggerTest : public LibraryTest {
protected:
    LoggerTest() { WriteFile(root_.File("usr/kelo/syslog/schema/kelosyslog.sql"), schema_); }

    // Creates the server's database with `rows` events at the times 1000, 1001, 1002, ...
    void CreateEvents(int rows) const {
        fs::create_directories(fs::path(db_).parent_path());
        RunSql(db_, "PRAGMA journal_mode=WAL; PRAGMA synchronous=OFF;" + schema_ +
                        "WITH n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i + 1 < " +
                        std::to_string(rows) +
                        ") INSERT INTO log SELECT NULL, 0, 1000 + i, 'SYSTEM', 'event ' || i FROM n");
    }
    std::string Query(const std::string &sql) const { return RunSql(db_, sql); }
    std::string Rows() const { return Query("SELECT count(*) FROM log"); }

    const std::string schema_ = ReadFile(BuildPath("package/schema/kelosyslog.sql"));
    const std::string db_ = root_.File("usr/kelo/etc/kelosyslog.db");
    Logger logger_;
};

// The calls of one LogAdd that rotates: each fails once, in turn.
TEST_F(LoggerTest, ReportsEachFailingStepAndKeepsTheEventOnceItIsIn) {
    const std::string noDatabase = "Fail to open db: " + db_ + ";Fail to connect db;",
                      failed = "Fail to execute SQL command: ", noRotation = ";Fail to rotate log database;";
    const std::tuple<const char *, int, std::string> cases[] = {
        {"connect", -1, noDatabase},
        {"BEGIN", 0, "Fail to begin transaction;Fail to check sanity (DBTranEnd);"},
        {"INSERT", -1, failed + "INSERT INTO log VALUES(NULL, '0', '*;"},
        {"END", -1, "Fail to end transaction;"},
        {"connect to count", 0, "Fail to connect syslog log database;"},
        {"COUNT", 0, "Fail to select syslog log database;"},
        {"fetch the count", 0, "Fail to fetch row;"},
        {"connect to rotate", 0, noDatabase + "Fail to rotate log database;"},
        {"SELECT time", 0,
         failed + "SELECT time FROM log ORDER BY time DESC LIMIT 1 OFFSET 18000" + noRotation},
        {"fetch the time", 0, ""},
        {"DELETE", 0, failed + "DELETE FROM log WHERE time <= 0" + noRotation},
        {"VACUUM", 0, failed + "VACUUM" + noRotation},
    };
    CreateEvents(19998);
    int rows = 19998;
    for (int call = 1; const auto &[step, result, pattern] : cases) {
        PlatformCalls::FailFrom(call++, 1);
        EXPECT_EQ(logger_.LogAdd(db_, 0, "ann", step), result) << step;
        EXPECT_TRUE(PlatformCalls::HasFailed()) << step;
        std::string messages;
        for (const std::string &text : TakeTexts())
            messages += text + ";";
        EXPECT_EQ(fnmatch(pattern.c_str(), messages.c_str(), 0), 0) << messages;
        rows += result == 0;
        EXPECT_EQ(Rows(), std::to_string(rows)) << step;
        EXPECT_EQ(PlatformCalls::OpenHandles(), 0) << step;
    }
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(logger_.LogAddVolFull(), -1);
    EXPECT_EQ(TakeTexts().back(), "Fail to add log");
}

TEST_F(LoggerTest, RotatesAbove19999RowsAndRemovesOnlyEventsWithoutATime) {
    CreateEvents(19998);
    RunSql(db_, "UPDATE log SET time = -id WHERE id <= 2");
    const std::pair<const char *, bool> cases[] = {
        {"19999", false}, {"19998", true}, {"19999", false}, {"20000", true}, {"20001", true}};
    for (const auto &[rows, rotates] : cases) {
        PlatformCalls::Reset();
        EXPECT_EQ(logger_.LogAdd(db_, 0, "SYSTEM", "new"), 0);
        EXPECT_EQ(testing::Value(PlatformCalls::Texts(), Contains("VACUUM")), rotates) << rows;
        EXPECT_EQ(Rows(), rows);
    }
    EXPECT_EQ(Query("PRAGMA freelist_count"), "0");
    EXPECT_THAT(TakeTexts(), IsEmpty());
}

TEST_F(LoggerTest, AnswersZeroToAClearingWithoutItsEvent) {
    CreateEvents(1);
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(logger_.LogClear(root_.File("none.db"), "ann"), 0);
    EXPECT_THAT(TakeTexts(), ElementsAre("Fail to open db: " + db_, "Fail to connect db", "Fail to add log",
                                         "logger:638 Fail to add log [Log was cleared.]"));
}

TEST_F(LoggerTest, LosesNothingWhenTwoProcessesAddAtOnceAndRotate) {
    CreateEvents(19980);
    for (const char *user : {"ann", "bob"}) {
        if (fork() != 0)
            continue;
        int failures = 0;
        for (int number = 0; number < 40; ++number)
            failures += Logger().LogAdd(db_, 0, user, std::to_string(number)) != 0;
        _exit(failures);
    }
    for (int child = 0; child < 2; ++child) {
        int status = -1;
        wait(&status);
        EXPECT_EQ(status, 0);
    }
    EXPECT_EQ(Rows(), "20060");
    EXPECT_EQ(Query("SELECT count(DISTINCT user || event) FROM log WHERE user != 'SYSTEM'"), "80");
}

class Enumeration : public LoggerTest {
protected:
    std::string Ids(int offset, int limit) {
        std::string ids;
        for (const _SSYSLOG_LOG_LOG_tag &event : logger_.LogEnum(db_, offset, limit))
            ids += std::to_string(event.id) + " ";
        return ids;
    }
};

TEST_F(Enumeration, GivesPagesNewestFirstAndNothingWhereItFails) {
    CreateEvents(6);
    RunSql(db_, "UPDATE log SET time = 1004 WHERE id = 1; DELETE FROM log WHERE id = 2");
    const std::tuple<int, int, std::string> cases[] = {
        {0, 0, "6 5 1 4 3 "}, {3, 0, "6 5 1 4 3 "}, {1, 2, "5 1 "}, {4, 10, "3 "}, {20, 10, ""},
    };
    for (const auto &[offset, limit, ids] : cases)
        EXPECT_EQ(Ids(offset, limit), ids) << limit << " after " << offset;
    EXPECT_THAT(TakeTexts(), IsEmpty());
    EXPECT_EQ(Ids(0, -1), "");
    EXPECT_THAT(TakeTexts(), ElementsAre("Fail to execute SQL command SELECT * FROM log ORDER BY time DESC "
                                         "LIMIT 18446744073709551615 OFFSET 0"));
    PlatformCalls::FailFrom(1, 1);
    EXPECT_EQ(Ids(0, 0), "");
    EXPECT_THAT(TakeTexts(), ElementsAre("Fail to open db: " + db_, "Fail to connect db"));
    PlatformCalls::FailFrom(5, 1);
    EXPECT_EQ(Ids(0, 0), "6 5 ") << "the rows up to one that cannot be fetched";
}

TEST_F(Enumeration, ReadsFieldsAsNumbersAndTextWhateverTheTableHolds) {
    EXPECT_EQ(logger_.LogAddVolFull(), 0);
    RunSql(db_, "DROP TABLE log; CREATE TABLE log (id, time, user, event);"
                "INSERT INTO log VALUES ('4294967298x', '99999999999', NULL, '<b>')");
    const std::list<_SSYSLOG_LOG_LOG_tag> events = logger_.LogEnum(db_, 0, 0);
    ASSERT_EQ(events.size(), 1U);
    EXPECT_EQ(events.front().id, 2);
    EXPECT_EQ(events.front().level, 0);
    EXPECT_EQ(events.front().time, 99999999999);
    EXPECT_EQ(events.front().user, "");
    EXPECT_EQ(events.front().event, "<b>");
}

// The schema keeps what a rotation and a page send from reading or sorting whole rows.
TEST_F(Enumeration, FindsItsRowsThroughTheIndexOnTime) {
    CreateEvents(3000);
    TestDatabase db(db_);
    const auto take = [](void *text, int, char **values, char **) {
        *static_cast<std::string *>(text) += values[3];
        return 0;
    };
    for (const std::string sql :
         {"SELECT time FROM log ORDER BY time DESC LIMIT 1 OFFSET 18000", "DELETE FROM log WHERE time <= 0",
          "SELECT COUNT(*) FROM log", "SELECT * FROM log ORDER BY time DESC LIMIT 50 OFFSET 100"}) {
        std::string plan;
        EXPECT_EQ(sqlite3_exec(db.Get(), ("EXPLAIN QUERY PLAN " + sql).c_str(), take, &plan, nullptr),
                  SQLITE_OK);
        EXPECT_THAT(plan, HasSubstr("INDEX log_time")) << sql;
        EXPECT_THAT(plan, Not(HasSubstr("TEMP B-TREE"))) << sql;
    }
}

TEST_F(Enumeration, WritesThePageInLocalTime) {
    const std::string page = root_.File("page.html");
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", page), 0);
    EXPECT_EQ(access(page.c_str(), F_OK), -1) << "no events, no file";
    RunSql(db_, "INSERT INTO log VALUES (1, 7, 1577836800, '', ''), (2, 2, 1593561600, '', '')");
    EXPECT_EQ(logger_.LogHtmlGen("", "x", page), -1);
    EXPECT_EQ(logger_.LogHtmlGen(db_, "", page), -1);
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", ""), -1);
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", root_.File("none/page.html")), 0);
    setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1); // not yet known to the C library
    WriteFile(page, std::string(100000, 'x'));
    EXPECT_EQ(logger_.LogHtmlGen(db_, "x", page), 0);
    setenv("TZ", "UTC0", 1);
    const std::string text = ReadFile(page);
    EXPECT_THAT(text,
                AllOf(HasSubstr("<th>User</th><th>Event</th></tr>"),
                      HasSubstr("Error</td>\n<td align=\"center\">2020-07-01T02:00:00<"),
                      HasSubstr("<td align=\"center\"></td>\n<td align=\"center\">2020-01-01T01:00:00<"),
                      Not(HasSubstr("xxx"))));
}

TEST(Levels, AreCutToTheBuffer) {
    for (const auto &[size, text] : {std::pair(64, "Warning"), {4, "War"}, {1, ""}, {0, "unchanged"}}) {
        char buffer[64] = "unchanged";
        EXPECT_EQ(szLevelGet(1, buffer, size), 0);
        EXPECT_STREQ(buffer, text) << size;
    }
    EXPECT_EQ(strLevelGet(-1) + strLevelGet(3), "");
}

} // namespace
} // namespace kelo::test
