#include "db/db_fixture.h"

namespace kelo::test {
namespace {

using Syslogng = DbTest;

TEST_F(Syslogng, HangsUpThePackagesServiceWhereThePackageIsEnabled) {
    PlatformCalls::answers.reload = false;
    EXPECT_EQ(SyslogngHupSignalSend(), -1);
    EXPECT_THAT(Take(), ElementsAre("Fail to send HUP signal to syslog-ng"));
    WriteFile(root_.File("var/packages/Quillbay/enabled"), "");
    PlatformCalls::answers.reload = true;
    EXPECT_EQ(SyslogngHupSignalSend(), 0);
    EXPECT_THAT(PlatformCalls::Texts({"KELOSystemdReload"}), ElementsAre("syslog-ng", "pkg-Quillbay-syslog"));
    EXPECT_THAT(Take(), IsEmpty());
}

TEST_F(Syslogng, ThrowsAwayAWorkingDatabaseBeyondItsLimit) {
    PlatformCalls::answers.reload = false; // is ignored
    const std::tuple<uintmax_t, int32_t, bool> cases[] = {
        {2047, 1, true}, {2048, 1, false}, {0, -1, false}, {uintmax_t{5} << 40, INT32_MAX, false}};
    const std::string target = root_.File("target");
    for (const auto &[bytes, limit, isKept] : cases) {
        for (const bool isLink : {false, true}) {
            SCOPED_TRACE(bytes);
            fs::remove(path_);
            WriteFile(target, "");
            std::error_code tooLarge;
            fs::resize_file(target, bytes, tooLarge);
            if (tooLarge)
                continue; // not on every file system
            isLink ? fs::create_symlink(target, path_) : fs::rename(target, path_);
            PlatformCalls::Reset();
            EXPECT_EQ(SyslogngWorkingDbCheck(path_, limit), 0);
            EXPECT_EQ(fs::exists(fs::symlink_status(path_)), isKept);
            EXPECT_TRUE(!isLink || fs::exists(target)) << "only the link goes";
            EXPECT_EQ(PlatformCalls::Texts({"KELOSystemdReload"}).size(), isKept ? 0u : 1u);
        }
    }
}

// A reader that still has a removed or quarantined database open and the users of the next one do not meet.
TEST_F(Syslogng, KeepsUsersOfAnOldDatabaseApartFromThoseOfTheNextOne) {
    for (const bool isRemoved : {true, false}) {
        Connect(3);
        InsertLogsIntoWal(path_, {SampleLog(3)});
        EXPECT_EQ(isRemoved ? SyslogngWorkingDbCheck(path_, 0) : DBErrorHandle_SQLITE_CORRUPT(nullptr, path_),
                  0);
        EXPECT_FALSE(fs::exists(path_ + "-wal") || fs::exists(path_ + "-shm"));
        CreateLogDatabase(path_, "archive.sql");
        InsertLogsIntoWal(path_, {SampleLog(0)});
        EXPECT_EQ(db_.DBLogCountGet(), 4);
        EXPECT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), "1");
        db_.DBDiscon();
        EXPECT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), "1");
        EXPECT_EQ(RunSql(path_, "PRAGMA integrity_check"), "ok");
        fs::remove(path_);
    }
    EXPECT_EQ(RunSql(path_ + ".corrupt", "SELECT count(*) FROM logs"), "4");
}

} // namespace
} // namespace kelo::test
