#include <sqlite3.h>
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

    std::unique_ptr<AccountingManager> accounting_ = std::make_unique<AccountingManager>();
};

TEST_F(Flush, SendsTheStatedStatementsInOneTransaction) {
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
    EXPECT_EQ(PlatformCalls::Statements(),
              (Texts{"BEGIN;", "INSERT INTO eps VALUES(NULL, '1000', 'a', '1');",
                     "INSERT INTO eps VALUES(NULL, '1001', 'a', '1');",
                     "INSERT INTO eps VALUES(NULL, '1001', 'b''c', '1');",
                     "INSERT OR REPLACE INTO histogram VALUES(NULL, 'a', 2);",
                     "INSERT OR REPLACE INTO histogram VALUES(NULL, 'b''c', 1);",
                     "INSERT OR REPLACE INTO histogram VALUES(NULL, 'd', 1);", "END;"}));
    EXPECT_EQ(Samples(), kRows);
    EXPECT_EQ(Histogram(), kCounts);
    // Without samples there is nothing to do, though a device's count has changed.
    PlatformCalls::Reset();
    accounting_->LogInc("d");
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
    EXPECT_THAT(PlatformCalls::Recorded(), IsEmpty());
}

TEST_F(Flush, KeepsTheSamplesOfAFailedStep) {
    const struct {
        const char *name;
        int call;
        int result;
        const char *samples;      // what the failed flush has written
        const char *afterAnother; // and what another one adds
        Texts messages;
    } cases[] = {
        {"connection",
         1,
         -1,
         "",
         kRows.c_str(),
         {"Fail to open db: " + path_, "Fail to connect db", "Fail to check sanity (DBTranEnd)"}},
        {"BEGIN", 2, 0, kRows.c_str(), "", {"Fail to begin transaction", "Fail to check sanity (DBTranEnd)"}},
        {"first sample",
         3,
         -1,
         "",
         kRows.c_str(),
         {kFailed + "INSERT INTO eps VALUES(NULL, '1000', 'a', '1');"}},
        {"second sample",
         4,
         -1,
         "1000 a 1",
         kRows.c_str(),
         {kFailed + "INSERT INTO eps VALUES(NULL, '1001', 'a', '1');"}},
        {"last sample",
         5,
         -1,
         "1000 a 1;1001 a 1",
         kRows.c_str(),
         {kFailed + "INSERT INTO eps VALUES(NULL, '1001', 'b''c', '1');"}},
        {"first count",
         6,
         -1,
         "",
         kRows.c_str(),
         {kFailed + "INSERT OR REPLACE INTO histogram VALUES(NULL, 'a', 2);",
          "Fail to check sanity (DBTranEnd)"}},
        {"last count",
         8,
         -1,
         "",
         kRows.c_str(),
         {kFailed + "INSERT OR REPLACE INTO histogram VALUES(NULL, 'd', 1);",
          "Fail to check sanity (DBTranEnd)"}},
        {"END", 9, 0, "", "", {"Fail to end transaction"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        Restart();
        PlatformCalls::FailFrom(c.call, 1);
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), c.result);
        Texts messages = Messages();
        std::erase_if(messages, [](const std::string &text) { return text.starts_with("dbhandler:"); });
        EXPECT_EQ(messages, c.messages);
        const std::string samples = Samples();
        EXPECT_EQ(samples, c.samples);
        EXPECT_EQ(Histogram(), c.call == 2 ? kCounts : "");
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
        const std::string separator = samples.empty() || *c.afterAnother == '\0' ? "" : ";";
        EXPECT_EQ(Samples(), samples + separator + c.afterAnother);
    }
}

TEST_F(Flush, TrimsOldSamplesOfALargeFile) {
    const auto fileOf = [](mode_t mode, off_t size) {
        struct stat status {};
        status.st_mode = mode;
        status.st_size = size;
        return std::optional(status);
    };
    const std::string old = "999 old 1";
    const std::string trim = "DELETE FROM eps WHERE stamp < strftime('%s', 'now') - 24*60*60;";
    // Within a day, with room for a slow machine.
    const std::string recentStamp = QueryText(path_, "SELECT strftime('%s', 'now') - 24*60*60 + 600");
    const std::string recent = recentStamp + " new 1";
    const struct {
        const char *name;
        std::optional<struct stat> status;
        bool failsTrim;
        int result;
        std::string samples;
        Texts messages;
    } cases[] = {
        {"5 MiB", fileOf(S_IFREG, 5242880), false, 0, old + ";" + recent + ";" + kRows, {}},
        {"a byte more", fileOf(S_IFREG, 5242881), false, 0, recent, {}},
        {"failed trim",
         fileOf(S_IFREG, 5242881),
         true,
         0,
         old + ";" + recent + ";" + kRows,
         {kFailed + trim}},
        {"no status",
         std::nullopt,
         false,
         -1,
         old + ";" + recent + ";" + kRows,
         {"Fail to state file status: " + path_}},
        {"no file",
         fileOf(S_IFIFO, 9999999),
         false,
         -1,
         old + ";" + recent + ";" + kRows,
         {"Working database is not regular file"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        Restart();
        RunSql(path_, "INSERT INTO eps VALUES(NULL, 999, 'old', 1), (NULL, " + recentStamp + ", 'new', 1)");
        machine.flushStat = [&] { return c.status; };
        if (c.failsTrim)
            PlatformCalls::FailFrom(9, 1);
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), c.result);
        machine.flushStat = nullptr;
        EXPECT_EQ(Samples(), c.samples);
        Texts messages = Messages();
        std::erase_if(messages, [](const std::string &text) { return text.starts_with("dbhandler:"); });
        EXPECT_EQ(messages, c.messages);
        // Only a failed flush writes its samples again.
        PlatformCalls::Reset();
        EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
        EXPECT_EQ(PlatformCalls::Statements().empty(), c.result == 0);
    }
}

TEST_F(Flush, WaitsForNobodyButKeepsTheSamples) {
    sqlite3 *db = nullptr;
    ASSERT_EQ(sqlite3_open(path_.c_str(), &db), SQLITE_OK);
    const std::unique_ptr<sqlite3, decltype(&sqlite3_close)> writer(db, sqlite3_close);
    ASSERT_EQ(sqlite3_exec(db, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), -1);
    EXPECT_THAT(Messages(), Contains(kFailed + "INSERT INTO eps VALUES(NULL, '1000', 'a', '1');"));
    ASSERT_EQ(sqlite3_exec(db, "COMMIT", nullptr, nullptr, nullptr), SQLITE_OK);
    EXPECT_EQ(Samples(), "");
    EXPECT_EQ(accounting_->AccoutingFlush2DB(), 0);
    EXPECT_EQ(Samples(), kRows);
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
