// Archiving while a writer works, and what a failure leaves.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sqlite3.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <thread>

#include "archive/archive_name.h"
#include "archive/database_copy.h"
#include "archive/removal.h"
#include "archive/retention.h"
#include "base/errors.h"
#include "base/stop_signals.h"
#include "faults/file_faults.h"
#include "support/log_database.h"
#include "support/temp_root.h"

namespace kelo::test {
namespace {

namespace fs = std::filesystem;
using namespace kelo::tool;
using std::chrono::steady_clock;

// Inserts batches without a pause, as a busy syslog-ng does, until it goes out of scope.
class Writer {
public:
    explicit Writer(const std::string &path) : thread_([this, path] { Write(path); }) {}
    // Waits until so many more rows are committed.
    void Await(int rows) const {
        for (const int goal = written_ + rows; written_ < goal && !hasFailed_;)
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    // Returns the longest time that a batch took, in milliseconds.
    int64_t Stop() {
        mustStop_ = true;
        thread_.join();
        EXPECT_EQ(failure_, "");
        return longestMs_;
    }
    int Written() const { return written_; }

private:
    void Write(const std::string &path) {
        sqlite3 *db = nullptr;
        sqlite3_open(path.c_str(), &db);
        sqlite3_busy_timeout(db, 1000);
        while (!mustStop_ && !hasFailed_) {
            const auto start = steady_clock::now();
            const std::string insert =
                "BEGIN IMMEDIATE; WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < "
                "100) "
                "INSERT INTO logs (host, utcsec, prog, msg) SELECT 'host' || (i % 3), 1600000000 + i, 'w', "
                "'written ' || (i + " +
                std::to_string(written_) + ") FROM n; COMMIT";
            char *error = nullptr;
            if (sqlite3_exec(db, insert.c_str(), nullptr, nullptr, &error) != SQLITE_OK)
                failure_ = error;
            hasFailed_ = !failure_.empty();
            sqlite3_free(error);
            const auto time = steady_clock::now() - start;
            longestMs_ = std::max<int64_t>(
                longestMs_, std::chrono::duration_cast<std::chrono::milliseconds>(time).count());
            written_ += hasFailed_ ? 0 : 100;
        }
        sqlite3_close(db);
    }

    std::atomic<bool> mustStop_ = false;
    std::atomic<int> written_ = 0;
    std::atomic<bool> hasFailed_ = false;
    std::string failure_; // the thread's until it has ended
    int64_t longestMs_ = 0;
    std::thread thread_;
};

class ArchiveTest : public testing::Test {
protected:
    ArchiveTest() {
        CreateLogDatabase(source_);
        fs::create_directory(folder_);
    }
    DatabaseCopy Make(const std::string &host, bool willRemove) const {
        ArchiveFolder folder(folder_, false);
        return MakeArchive({source_, host, host.empty() ? "it's me" : host}, folder, willRemove);
    }
    std::vector<std::string> Left() const {
        std::vector<std::string> names;
        for (const auto &file : fs::directory_iterator(folder_))
            names.push_back(file.path().filename());
        return names;
    }
    // What is wrong with the archives and the source: logs lost or there twice.
    std::string Account(const std::vector<std::string> &archives, int written) const {
        std::string all = "SELECT msg FROM main.logs";
        std::string attach;
        for (const std::string &archive : archives) {
            const std::string name = "a" + std::to_string(attach.size());
            attach += "ATTACH '" + archive + "' AS " + name + ";";
            all += " UNION ALL SELECT msg FROM " + name + ".logs";
        }
        RunSql(source_, attach +
                            "CREATE TABLE IF NOT EXISTS account AS SELECT count(*) || ' ' || "
                            "count(DISTINCT msg) AS found FROM (" +
                            all + ")");
        const std::string expected = std::to_string(written) + " " + std::to_string(written);
        const std::string found = RunSql(source_, "SELECT found FROM account");
        return found == expected ? "" : found + " instead of " + expected;
    }

    TempRoot root_;
    std::string source_ = root_.File("logs.db");
    std::string folder_ = root_.File("archive");
};

TEST_F(ArchiveTest, CopiesAPrefixAndRemovesExactlyThatBesideAWriter) {
    Writer writer(source_);
    writer.Await(10'000);
    const DatabaseCopy ofHost = Make("host1", true);
    Removal(source_, ofHost.path).Run();
    EXPECT_EQ(RunSql(ofHost.path, "SELECT group_concat(DISTINCT host) FROM logs"), "host1");
    writer.Await(10'000);
    const DatabaseCopy whole = Make("", true);
    EXPECT_THAT(Left(), testing::SizeIs(4)) << "two archives and the notes of their removals";
    EXPECT_EQ(RunSql(whole.path, "PRAGMA integrity_check"), "ok");
    const std::string all = "(SELECT id FROM logs UNION SELECT id FROM h.logs)";
    RunSql(whole.path, "ATTACH '" + ofHost.path +
                           "' AS h; CREATE TABLE prefix AS SELECT count(*) = max(id) AS whole FROM " + all);
    EXPECT_EQ(RunSql(whole.path, "SELECT whole FROM prefix"), "1");
    EXPECT_EQ(RunSql(whole.path, "SELECT start_time || end_time || log_count || device FROM db_info"),
              "16000000011600000100" + std::to_string(whole.logs) + "it's me");
    Removal removal(source_, whole.path);
    removal.Run();
    EXPECT_EQ(removal.Removed(), whole.logs);
    writer.Await(1000);
    std::printf("longest batch of the writer: %d ms\n", static_cast<int>(writer.Stop()));
    EXPECT_EQ(Account({whole.path, ofHost.path}, writer.Written()), "");
}

// The last step was never reached by a run that was killed; the next one tidies up.
TEST_F(ArchiveTest, EndsTidilyAtASignalAndAfterAKill) {
    InsertSampleLogs(source_, 100);
    for (const char *name : {".kelosyslog-archive-1", ".kelosyslog-archive-1-wal", ".removing-gone.db"})
        WriteFile(folder_ + "/" + name, "left");
    WriteFile(folder_ + "/other", "stays");
    const StopSignals signals;
    CopyOrder order{source_, "", "nas"};
    order.onCopied = [](uint64_t) { std::raise(SIGTERM); };
    {
        ArchiveFolder folder(folder_, false);
        EXPECT_THROW(MakeArchive(order, folder, true), Interrupted);
    }
    EXPECT_THAT(Left(), testing::ElementsAre("other"));
}

TEST_F(ArchiveTest, LeavesRowsThatTookTheIdsOfRemovedOnes) {
    InsertSampleLogs(source_, 20);
    const DatabaseCopy archive = Make("", true);
    RunSql(source_, "UPDATE logs SET msg = 'another' WHERE id > 5; DELETE FROM logs WHERE id < 3");
    Removal removal(source_, archive.path);
    removal.Run();
    EXPECT_EQ(removal.Removed(), 3U);
    EXPECT_EQ(RunSql(source_, "SELECT group_concat(DISTINCT msg) || count(*) FROM logs"), "another15");
}

// Every write fails once, as on a full disk or with an error.
TEST_F(ArchiveTest, LeavesNothingWhenAWriteFails) {
    InsertSampleLogs(source_, 300);
    RunSql(source_, "DELETE FROM logs WHERE id < 150"); // so that the copy is compacted
    for (const FileFaults::Kind kind : {FileFaults::Kind::kWrite, FileFaults::Kind::kFull}) {
        for (int first = 1;; ++first) {
            FileFaults::Start(kind, first, 1);
            bool isMade = true;
            try {
                Make("", true);
            } catch (const std::exception &error) {
                isMade = false;
                EXPECT_NE(std::string(error.what()).find(root_.Path()), std::string::npos) << error.what();
            }
            const bool hasFailed = FileFaults::Stop();
            EXPECT_EQ(RunSql(source_, "SELECT count(*) FROM logs"), "151");
            if (!isMade) {
                ASSERT_THAT(Left(), testing::IsEmpty()) << first;
                continue;
            }
            for (const Archive &archive : ListArchives(folder_))
                EXPECT_EQ(RunSql(folder_ + "/" + archive.name, "SELECT count(*) FROM logs"), "151") << first;
            EXPECT_FALSE(FileFaults::IsUnsynced(folder_ + "/" + ListArchives(folder_).at(0).name));
            for (const std::string &name : Left())
                fs::remove(folder_ + "/" + name);
            if (!hasFailed)
                break;
        }
    }
}

TEST(ArchiveName, IsSafeAndRecognised) {
    const struct {
        std::string device, name;
    } cases[] = {
        {"nas-1.lan", "nas-1.lan"},  {"../../etc", "_._.._etc"},
        {".hidden", "_hidden"},      {"-rf", "_rf"},
        {"a b\n\t'\"$", "a_b_____"}, {"", "_"},
        {"n\xc3\xa4s", "n__s"},      {std::string(300, 'x'), std::string(100, 'x')},
    };
    for (const auto &c : cases) {
        EXPECT_EQ(SafeDeviceName(c.device), c.name);
        const std::string first = ArchiveName(c.device, "2020-01-02", "2020-02-03", 1);
        EXPECT_EQ(first, c.name + "_2020-01-02_2020-02-03.db");
        EXPECT_TRUE(IsArchiveName(first) &&
                    IsArchiveName(ArchiveName(c.device, "2020-01-02", "2020-02-03", 12)));
    }
    for (const char *name :
         {"logs.db", "a_2020-01-02.db", "a_2020-01-02_2020-02-03.db-wal", ".a_2020-01-02_2020-02-03.db"})
        EXPECT_FALSE(IsArchiveName(name)) << name;
}

TEST(Retention, TakesTheOldestAndSparesTheNewOne) {
    const std::vector<Archive> archives = {
        {"a", "", 0, 100, 1, 10}, {"b", "", 0, 200, 1, 20}, {"c", "", 0, 300, 1, 40}};
    const std::vector<Archive> withoutTimes = {{"a", "", 0, 0, 1, 10}};
    EXPECT_TRUE(Expired(withoutTimes, {1000, {}, ""}).empty()) << "its age is not known";
    const struct {
        Retention retention;
        std::string expired;
    } cases[] = {
        {{}, ""},
        {{200, {}, ""}, "a"},
        {{1000, {}, "b"}, "ac"},
        {{{}, 70, ""}, ""},
        {{{}, 69, ""}, "a"},
        {{{}, 40, "a"}, "bc"},
        {{{}, 60, "a"}, "b"},
        {{101, 40, ""}, "ab"},
    };
    for (const auto &c : cases) {
        std::string names;
        for (const Archive &archive : Expired(archives, c.retention))
            names += archive.name;
        EXPECT_EQ(names, c.expired);
    }
    EXPECT_EQ(ParseSize("s", "10G"), uint64_t{10} << 30);
    EXPECT_EQ(ParseSize("s", "3KiB"), 3072U);
    for (const char *text :
         {"", "G", "0", "-1", "1X", "1GX", "1 G", "1.5G", "20000000T", "99999999999999999999"})
        EXPECT_THROW(ParseSize("s", text), UsageError) << text;
}

} // namespace
} // namespace kelo::test
