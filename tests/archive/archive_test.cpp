// What archiving copies and removes, and what a failure leaves.

#include <sys/file.h>

#include "archive/archive_name.h"
#include "archive/database_copy.h"
#include "archive/removal.h"
#include "archive/retention.h"
#include "base/errors.h"
#include "base/stop_signals.h"
#include "faults/file_faults.h"
#include "support/test.h"

namespace kelo::test {
namespace {

using namespace kelo::tool;

class ArchiveTest : public testing::Test {
protected:
    ArchiveTest() {
        CreateLogDatabase(source_);
        fs::create_directory(folder_);
        // Whoever may only read the folder cannot stop archiving.
        reader_ = open(folder_.c_str(), O_RDONLY | O_CLOEXEC);
        EXPECT_EQ(flock(reader_, LOCK_EX), 0);
    }
    ~ArchiveTest() override {
        struct stat lock {};
        EXPECT_EQ(stat((folder_ + "/.lock").c_str(), &lock), 0);
        EXPECT_EQ(lock.st_mode & 0444, 0U) << "who can open the lock can stop archiving";
        close(reader_);
    }
    DatabaseCopy Make(const std::string &host = "") const {
        ArchiveFolder folder(folder_, false);
        return MakeArchive({source_, host, host.empty() ? "it's me" : host}, folder, true);
    }
    std::vector<std::string> Left() const {
        std::vector<std::string> names;
        for (const auto &file : fs::directory_iterator(folder_))
            names.push_back(file.path().filename());
        std::erase(names, ".lock");
        return names;
    }

    TempRoot root_;
    std::string source_ = root_.File("logs.db");
    std::string folder_ = root_.File("archive");
    int reader_ = -1;
};

TEST_F(ArchiveTest, CopiesAPrefixAndRemovesExactlyThatWhateverComesMeanwhile) {
    InsertSampleLogs(source_, 500);
    const DatabaseCopy ofHost = Make("host01");
    InsertSampleLogs(source_, 100);
    Removal(source_, ofHost.path).Run();
    EXPECT_EQ(RunSql(ofHost.path, "SELECT host || count(*) FROM logs GROUP BY host"), "host0110");
    const DatabaseCopy whole = Make();
    EXPECT_THAT(Left(), testing::SizeIs(4)) << "two archives and the notes of their removals";
    EXPECT_EQ(RunSql(whole.path, "PRAGMA integrity_check"), "ok");
    EXPECT_EQ(RunSql(whole.path, "SELECT start_time || end_time || log_count || device FROM db_info"),
              "15778368001577837299590it's me");
    InsertSampleLogs(source_, 100);
    Removal removal(source_, whole.path);
    removal.Run();
    EXPECT_EQ(removal.Removed(), whole.logs);
    TestDatabase all(source_);
    all.Run("ATTACH '" + whole.path + "' AS whole; ATTACH '" + ofHost.path + "' AS host");
    EXPECT_EQ(all.Run("SELECT count(*) || ' ' || min(id) FROM main.logs"), "100 601");
    EXPECT_EQ(
        all.Run(
            "SELECT count(DISTINCT id) FROM (SELECT id FROM whole.logs UNION ALL SELECT id FROM host.logs)"),
        "600");
}

// The last step was never reached by a run that was killed; the next one tidies up.
TEST_F(ArchiveTest, EndsTidilyAtASignalAndAfterAKill) {
    InsertSampleLogs(source_, 100);
    for (const char *name :
         {".kelosyslog-archive-1", ".kelosyslog-archive-1-wal", ".removing-gone.db", "other"})
        WriteFile(folder_ + "/" + name, "left");
    const StopSignals signals;
    CopyOrder order{source_, "", "nas"};
    order.onCopied = [](uint64_t) { std::raise(SIGTERM); };
    {
        ArchiveFolder folder(folder_, false);
        EXPECT_THROW(MakeArchive(order, folder, true), Interrupted);
    }
    EXPECT_THAT(Left(), ElementsAre("other"));
}

TEST_F(ArchiveTest, LeavesRowsThatTookTheIdsOfRemovedOnes) {
    InsertSampleLogs(source_, 20);
    const DatabaseCopy archive = Make();
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
        bool hasFailed = true;
        for (int first = 1; hasFailed; ++first) {
            SCOPED_TRACE(first);
            FileFaults::Start(kind, first, 1);
            std::string failure;
            try {
                Make();
            } catch (const std::exception &error) {
                failure = error.what();
            }
            hasFailed = FileFaults::Stop();
            EXPECT_THAT(failure, AnyOf("", HasSubstr(root_.Path())));
            EXPECT_EQ(RunSql(source_, "SELECT count(*) FROM logs"), "151");
            const std::vector<Archive> archives = ListArchives(folder_);
            ASSERT_EQ(archives.size(), failure.empty() ? 1U : 0U);
            for (const Archive &archive : archives) {
                EXPECT_EQ(RunSql(folder_ + "/" + archive.name, "SELECT count(*) FROM logs"), "151");
                EXPECT_FALSE(FileFaults::IsUnsynced(folder_ + "/" + archive.name));
            }
            EXPECT_TRUE(failure.empty() || Left().empty());
            for (const std::string &name : Left())
                fs::remove(folder_ + "/" + name);
        }
    }
}

TEST(ArchiveName, IsSafeAndRecognised) {
    const std::pair<std::string, std::string> cases[] = {
        {"nas-1.lan", "nas-1.lan"},  {"../../etc", "_._.._etc"},
        {".hidden", "_hidden"},      {"-rf", "_rf"},
        {"a b\n\t'\"$", "a_b_____"}, {"", "_"},
        {"n\xc3\xa4s", "n__s"},      {std::string(300, 'x'), std::string(100, 'x')},
    };
    for (const auto &[device, name] : cases) {
        EXPECT_EQ(SafeDeviceName(device), name);
        const std::string first = ArchiveName(device, "2020-01-02", "2020-02-03", 1);
        EXPECT_EQ(first, name + "_2020-01-02_2020-02-03.db");
        EXPECT_TRUE(IsArchiveName(first) &&
                    IsArchiveName(ArchiveName(device, "2020-01-02", "2020-02-03", 12)));
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
    const std::pair<Retention, std::string> cases[] = {
        {{}, ""},
        {{200, {}, ""}, "a"},
        {{1000, {}, "b"}, "ac"},
        {{{}, 70, ""}, ""},
        {{{}, 69, ""}, "a"},
        {{{}, 40, "a"}, "bc"},
        {{{}, 60, "a"}, "b"},
        {{101, 40, ""}, "ab"},
    };
    for (const auto &[retention, expired] : cases) {
        std::string names;
        for (const Archive &archive : Expired(archives, retention))
            names += archive.name;
        EXPECT_EQ(names, expired);
    }
    EXPECT_EQ(ParseSize("s", "10G"), uint64_t{10} << 30);
    EXPECT_EQ(ParseSize("s", "3KiB"), 3072U);
    for (const char *text :
         {"", "G", "0", "-1", "1X", "1GX", "1 G", "1.5G", "20000000T", "99999999999999999999"})
        EXPECT_THROW(ParseSize("s", text), UsageError) << text;
}

} // namespace
} // namespace kelo::test
