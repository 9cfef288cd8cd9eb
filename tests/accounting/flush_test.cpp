#include "accounting/accounting_fixture.h"

using namespace kelo::test;

namespace {

using Texts = std::vector<std::string>;

const std::string kFailed = "Fail to execute SQL command: ";
const std::string kRows = "1000 a 1;1001 a 1;1001 b'c 1";
const std::string kCounts = "a 2;b'c 1;d 1";

// Three sample rows that wait for a flush, and a log in the open sample.
void CountLogs(AccountingManager &accounting) {
    machine.now = 1000;
    accounting.LogInc("a");
    accounting.LogInc("a");
    accounting.LogInc("b'c");
    machine.now = 1001;
    accounting.LogInc("d");
}

using Flush = AccountingTest;

TEST_F(Flush, GivesUpTheOldestSamplesAboveABound) {
    AccountingManager accounting;
    CountLogs(accounting);
    EXPECT_EQ(accounting.SamplesDrop(2, 3), 0U);
    EXPECT_EQ(accounting.SamplesDrop(2, 2), 1U);
    EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
    EXPECT_EQ("1000 a 1;" + Samples(), kRows);
    EXPECT_EQ(Histogram(), kCounts);
}

TEST_F(Flush, TrimsOldSamplesOfALargeFile) {
    // Within a day, with room for a slow machine.
    const std::string stamp = QueryText(path_, "SELECT strftime('%s', 'now') - 24*60*60 + 600");
    const std::string recent = stamp + " new 1";
    const std::string all = "999 old 1;" + recent + ";" + kRows;
    const struct {
        int filler; // bytes
        int fault;  // the call that fails; 1000 for none
        std::string samples;
        Texts messages;
    } cases[] = {
        {5000000, 1000, all, {}},
        {5300000, 9, all, {kFailed + "DELETE FROM eps WHERE stamp < strftime('%s', 'now') - 24*60*60;"}},
        {5300000, 1000, recent, {}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.filler + c.fault);
        RunSql(path_, "DELETE FROM eps; DELETE FROM histogram");
        AccountingManager accounting;
        CountLogs(accounting);
        RunSql(path_, "INSERT INTO eps VALUES(NULL, 999, 'old', 1), (NULL, " + stamp + ", 'new', 1);" +
                          "CREATE TABLE filler AS SELECT zeroblob(" + std::to_string(c.filler) + ")");
        PlatformCalls::FailFrom(c.fault, 1);
        EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
        RunSql(path_, "DROP TABLE filler; VACUUM");
        EXPECT_EQ(Samples(), c.samples);
        EXPECT_EQ(Messages(), c.messages);
        PlatformCalls::Reset();
        EXPECT_EQ(accounting.AccoutingFlush2DB(), 0);
        EXPECT_THAT(PlatformCalls::Recorded(), IsEmpty()) << "without samples there is nothing to do";
    }
}

// In a process of its own, which dies before its `step`-th SQLite step.
int FlushAndDie(int step) {
    const pid_t child = fork();
    if (child == 0) {
        AccountingManager accounting;
        CountLogs(accounting);
        machine.beforeStep = [&step] {
            if (--step == 0)
                raise(SIGKILL);
        };
        _exit(accounting.AccoutingFlush2DB() == 0 ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return status;
}

TEST_F(Flush, IsWholeOrNothingWhenTheProcessIsKilled) {
    int step = 1;
    for (int status = -1; status != 0; ++step) {
        RunSql(path_, "DELETE FROM eps; DELETE FROM histogram");
        status = FlushAndDie(step);
        ASSERT_TRUE(status == 0 || WIFSIGNALED(status)) << status;
        EXPECT_EQ(QueryText(path_, "PRAGMA integrity_check"), "ok");
        EXPECT_EQ(Samples(), status == 0 ? kRows : "") << step;
        EXPECT_EQ(Histogram(), status == 0 ? kCounts : "") << step;
    }
    EXPECT_GT(step, 8) << "not every statement was met";
}

} // namespace
