#include "eventlog/event_fixture.h"
#include "support/naive_match.h"

namespace kelo::test {
namespace {

using LoggerTest = EventTest;

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
        EXPECT_TRUE(NaiveMatch(messages, pattern)) << messages;
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

} // namespace
} // namespace kelo::test
