// Files that are no good database: every operation says so with its stated result and message, opens nothing
// for good and creates no file.

#include <chrono>

#include "kelosyslog/dbhandler.h"
#include "kelosyslog/dbutil.h"
#include "kelosyslog/failure.h"
#include "read/log_table.h"
#include "support/doubles.h"
#include "support/test.h"

namespace {

int (*waitForLock)(void *, int) = nullptr; // as the last connection has it
int givenUp = 0;                           // waits for a lock

} // namespace

// In this program a connection, but for those of the tests themselves, waits for a lock only until its
// handler was asked twice.
extern "C" int sqlite3_busy_handler(sqlite3 *db, int (*handler)(void *, int), void *context) {
    using namespace kelo::test;
    const auto install = Real<&sqlite3_busy_handler>("sqlite3_busy_handler");
    if (FaultPause::IsActive())
        return install(db, handler, context);
    waitForLock = handler;
    const auto waitTwice = [](void *unused, int calls) {
        return calls < 2 ? waitForLock(unused, calls) : (++givenUp, 0);
    };
    return install(db, waitTwice, context);
}

namespace kelo::test {
namespace {

const std::list<_SYSLOG_SQL_COND_tag> kFromHost3 = {{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "host03", {}}};

int CountRow(_SYSLOG_LOG_DATA_tag &, void *context) {
    ++*static_cast<int *>(context);
    return 0;
}

// A database in one file, without a write-ahead log.
void CreateSingleFile(const std::string &path) {
    CreateLogDatabase(path);
    InsertSampleLogs(path, 200);
    RunSql(path, "PRAGMA journal_mode = DELETE");
}

TEST(BadDatabase, IsNotFoundByAPathThatOnlyBeginsWithItsName) {
    const TempRoot root;
    CreateSingleFile(root.File("logs.db"));
    const std::string path = root.File("logs.db") + std::string("\0.old", 5);
    EXPECT_EQ(SyslogDBSelectCount(path, {}, nullptr, nullptr), -1);
    EXPECT_EQ(SyslogDBDelete(path, {}), -1);
    EXPECT_EQ(RunSql(root.File("logs.db"), "SELECT count(*) FROM logs"), "200");
}

TEST(LockedDatabase, FailsAfterWaiting) {
    givenUp = 0;
    const TempRoot root;
    const std::string path = root.File("logs.db");
    CreateSingleFile(path);
    DatabaseLock lock(path, "BEGIN EXCLUSIVE");
    int rows = 0;
    EXPECT_EQ(SyslogDBSelect(path, kFromHost3, nullptr, nullptr, CountRow, &rows, false), -1);
    EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_BUSY);
    EXPECT_EQ(tool::DescribeDatabaseProblem({path}),
              "cannot read " + path + ": it is locked by another program (database is locked)");
    EXPECT_EQ(SyslogDBSelectCount(path, kFromHost3, nullptr, nullptr), -1);
    EXPECT_EQ(SyslogDBDelete(path, kFromHost3), -1);
    EXPECT_EQ(rows, 0);
    EXPECT_EQ(givenUp, 3);
    EXPECT_NE(waitForLock(nullptr, 1000), 0) << "it is asked every millisecond";
    // A writer does not keep readers out of a database with a write-ahead log.
    lock.Run("COMMIT; PRAGMA journal_mode = WAL; BEGIN IMMEDIATE");
    EXPECT_EQ(SyslogDBSelectCount(path, kFromHost3, nullptr, nullptr), 4);
    EXPECT_EQ(givenUp, 3);
    EXPECT_EQ(SyslogDBDelete(path, kFromHost3), -1);
    EXPECT_EQ(givenUp, 4);
    EXPECT_EQ(PlatformCalls::OpenHandles(), 0);
    EXPECT_EQ(RunSql(path, "SELECT count(*) FROM logs"), "200");
}

// Overwrites or cuts: where it hits is up to `random`.
std::string Damaged(std::string content, std::mt19937 &random) {
    const auto below = [&](size_t bound) {
        return std::uniform_int_distribution<size_t>(0, bound - 1)(random);
    };
    if (below(5) == 0) {
        content.resize(below(content.size()));
        return content;
    }
    constexpr size_t kPage = 4096;
    const size_t page = below(content.size() / kPage) * kPage;
    // The header of the file and its schema; that of a page, where its cells are listed; anywhere.
    const std::pair<size_t, size_t> ranges[] = {{0, 600}, {page, 16}, {page, kPage}};
    const auto &[first, size] = ranges[below(3)];
    for (size_t bytes = 1 + below(16); bytes > 0; --bytes)
        content[first + below(size)] = static_cast<char>(random());
    return content;
}

// Works on the database through a handler, which puts a corrupt one aside. Returns whether all went well.
bool HandleErrors(const std::string &path) {
    DBHandler db(path, "");
    if (db.DBCon() != 0)
        return false;
    _ARCH_DB_INFO_tag info;
    const size_t quarantines = PlatformCalls::Sent().size();
    const int64_t count = db.DBLogCountGet();
    const int status = db.DBExecute("SELECT * FROM logs ORDER BY msg") |
                       db.DBExecute("UPDATE logs SET msg = 'x' WHERE id % 7 = 0") | db.DBTranStart() |
                       db.DBExecute("DELETE FROM logs WHERE host = 'host05'") | db.DBTranEnd();
    db.DBInfoGet(info);
    db.DBLogStartTimeGet();
    db.DBDiscon();
    EXPECT_EQ(fs::exists(path), PlatformCalls::Sent().size() == quarantines);
    return count >= 0 && status == 0;
}

TEST(DamagedDatabase, GivesAnErrorAndNeverACrash) {
    PlatformCalls::Start();
    const TempRoot root;
    const std::string path = root.File("logs.db");
    CreateSingleFile(path);
    RunSql(path, "PRAGMA journal_mode = WAL");
    InsertLogsIntoWal(path, {SampleLog(203), SampleLog(204)});
    const std::string database = ReadFile(path);
    const std::string wal = ReadFile(path + "-wal");
    ASSERT_GT(wal.size(), 4096u);
    std::mt19937 random(20200102); // repeatable
    int failures = 0;
    for (int round = 0; round < 1000; ++round) {
        SCOPED_TRACE(round);
        fs::remove(path + "-shm");
        const bool hitsWal = round % 4 == 0;
        WriteFile(path, hitsWal ? database : Damaged(database, random));
        WriteFile(path + "-wal", hitsWal ? Damaged(wal, random) : round % 4 == 1 ? wal : "");
        fs::remove(path + ".corrupt");
        const auto start = std::chrono::steady_clock::now();
        int rows = 0;
        const int select = SyslogDBSelect(path, kFromHost3, nullptr, nullptr, CountRow, &rows, true);
        const int count = SyslogDBSelectCount(path, {}, nullptr, nullptr);
        const int deletion = SyslogDBDelete(path, kFromHost3);
        EXPECT_TRUE(select == 0 || (select == -1 && rows == 0)) << select;
        EXPECT_GE(count, -1);
        EXPECT_TRUE(deletion == 0 || deletion == -1) << deletion;
        const bool isHandled = HandleErrors(path);
        failures += select == -1 || deletion == -1 || !isHandled;
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(1));
        EXPECT_EQ(PlatformCalls::OpenHandles(), 0);
        for (const auto &file : fs::directory_iterator(root.Path()))
            ASSERT_TRUE(file.path().string().starts_with(path)) << file;
    }
    EXPECT_GT(failures, 100) << "hardly any database was damaged";
}

} // namespace
} // namespace kelo::test
