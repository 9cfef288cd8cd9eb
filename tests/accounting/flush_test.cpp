#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <memory>

#include "accounting/accounting_fixture.h"

using namespace kelo::test;
using testing::Contains;
using testing::IsEmpty;
using testing::StartsWith;

namespace {

using Texts = std::vector<std::string>;

const std::string kFailed = "Fail to execute SQL command: ";
const std::string kRows = "1000 a 1;1001 a 1;1001 b'c 1";
const std::string kCounts = "a 2;b'c 1;d 1";
const Texts kStatements = {"BEGIN;",
                           "INSERT INTO eps VALUES(NULL, '1000', 'a', '1');",
                           "INSERT INTO eps VALUES(NULL, '1001', 'a', '1');",
                           "INSERT INTO eps VALUES(NULL, '1001', 'b''c', '1');",
                           "INSERT OR REPLACE INTO histogram VALUES(NULL, 'a', 2);",
                           "INSERT OR REPLACE INTO histogram VALUES(NULL, 'b''c', 1);",
                           "INSERT OR REPLACE INTO histogram VALUES(NULL, 'd', 1);",
                           "END;"};

// Three sample rows that wait for a flush, and a log in the open sample.
void CountLogs(AccountingManager &accounting) {
    machine.now = 1000;
    accounting.LogInc("a");
    accounting.LogInc("a");
    accounting.LogInc("b'c");
    machine.now = 1001;
    accounting.LogInc("d");
}

class Flush : public AccountingTest {
protected:
    Flush() {
        CountLogs(*accounting_);
        PlatformCalls::Reset();
    }
    ~Flush() override { accounting_.reset(); }

    void Restart() {
        accounting_.reset();
        RunSql(path_, "DELETE FROM eps; DELETE FROM histogram");
        accounting_ = std::make_unique<AccountingManager>();
        CountLogs(*accounting_);
        Messages();
    }

    // Without the lines of the database handler.
    Texts FlushMessages() {
        Texts messages = Messages();
        std::erase_if(messages, [](const std::string &text) { return text.starts_with("dbhandler:"); });
        return messages;
    }

    std::unique_ptr<AccountingManager> accounting_ = std::make_unique<AccountingManager>();
};

TEST_F(Flush, SendsTheStatedStatementsInOneTransaction) {
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
    EXPECT_EQ(PlatformCalls::Statements(), kStatements);
    EXPECT_EQ(Samples(), kRows);
    EXPECT_EQ(Histogram(), kCounts);
    // Without samples there is nothing to do, though a device's count has changed.
    PlatformCalls::Reset();
    accounting_->LogInc("d");
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
    EXPECT_THAT(PlatformCalls::Recorded(), IsEmpty());
}

TEST_F(Flush, KeepsTheSamplesOfAFailedStep) {
    const std::string noTransaction = "Fail to check sanity (DBTranEnd)";
    const struct {
        int call; // the one that fails: 1 is the connection, the others follow it
        int result;
        std::string written;
        Texts messages;
    } cases[] = {
        {1, -1, "", {"Fail to open db: " + path_, "Fail to connect db", noTransaction}},
        {2, 0, kRows, {"Fail to begin transaction", noTransaction}},
        {3, -1, "", {kFailed + kStatements[1]}},
        {4, -1, "1000 a 1;", {kFailed + kStatements[2]}},
        {5, -1, "1000 a 1;1001 a 1;", {kFailed + kStatements[3]}},
        {6, -1, "", {kFailed + kStatements[4], noTransaction}},
        {8, -1, "", {kFailed + kStatements[6], noTransaction}},
        {9, 0, "", {"Fail to end transaction"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.call);
        Restart();
        PlatformCalls::FailFrom(c.call, 1);
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), c.result);
        EXPECT_EQ(FlushMessages(), c.messages);
        EXPECT_EQ(Samples(), c.written.substr(0, c.written.find_last_not_of(';') + 1));
        EXPECT_EQ(Histogram(), c.call == 2 ? kCounts : "");
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
        EXPECT_EQ(Samples(), c.result == 0 ? c.written : c.written + kRows);
    }
}

TEST_F(Flush, GivesUpTheOldestSamplesAboveABound) {
    EXPECT_EQ(accounting_->SamplesDrop(2, 3), 0U);
    EXPECT_EQ(accounting_->SamplesDrop(2, 2), 1U);
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
    EXPECT_EQ("1000 a 1;" + Samples(), kRows);
    EXPECT_EQ(Histogram(), kCounts);
}

TEST_F(Flush, TrimsOldSamplesOfALargeFile) {
    const auto fileOf = [](mode_t mode, off_t size) {
        struct stat status {};
        status.st_mode = mode;
        status.st_size = size;
        return std::optional(status);
    };
    const std::string trim = "DELETE FROM eps WHERE stamp < strftime('%s', 'now') - 24*60*60;";
    // Within a day, with room for a slow machine.
    const std::string stamp = QueryText(path_, "SELECT strftime('%s', 'now') - 24*60*60 + 600");
    const std::string recent = stamp + " new 1";
    const std::string all = "999 old 1;" + recent + ";" + kRows;
    const int trimCall = 9;
    const struct {
        std::optional<struct stat> status;
        int fault; // the call that fails; 0 for none
        int result;
        std::string samples;
        Texts messages;
    } cases[] = {
        {fileOf(S_IFREG, 5242880), 0, 0, all, {}},
        {fileOf(S_IFREG, 5242881), 0, 0, recent, {}},
        {fileOf(S_IFREG, 5242881), trimCall, 0, all, {kFailed + trim}},
        {std::nullopt, 0, -1, all, {"Fail to state file status: " + path_}},
        {fileOf(S_IFIFO, 9999999), 0, -1, all, {"Working database is not regular file"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(testing::PrintToString(c.messages));
        Restart();
        RunSql(path_, "INSERT INTO eps VALUES(NULL, 999, 'old', 1), (NULL, " + stamp + ", 'new', 1)");
        machine.flushStat = [&] { return c.status; };
        if (c.fault != 0)
            PlatformCalls::FailFrom(c.fault, 1);
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), c.result);
        machine.flushStat = nullptr;
        EXPECT_EQ(Samples(), c.samples);
        EXPECT_EQ(FlushMessages(), c.messages);
        // Only a failed flush writes its samples again.
        PlatformCalls::Reset();
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
        EXPECT_EQ(PlatformCalls::Statements().empty(), c.result == 0);
    }
}

TEST_F(Flush, CreatesAMissingDatabase) {
    for (const char *companion : {"", "-wal", "-shm"})
        std::filesystem::remove(path_ + companion);
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), -1);
    EXPECT_THAT(Messages(), Contains(StartsWith("Fail to create database: " + path_)));
    Write("/usr/kelo/syslog/schema/accinfo.sql", ReadFile(KELO_SOURCE_DIR "/package/schema/accinfo.sql"));
    std::filesystem::remove(path_); // the sqlite3 tool leaves an empty file behind
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
    EXPECT_EQ(Samples(), kRows);
    EXPECT_EQ(SyslogDBHistTotalGet(path_), 4u);
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
