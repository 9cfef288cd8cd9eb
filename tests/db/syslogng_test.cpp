#include <filesystem>

#include "db/db_fixture.h"

namespace kelo::test {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
namespace fs = std::filesystem;

using Syslogng = DbTest;

TEST_F(Syslogng, HangsUpThePackagesServiceWhereThePackageIsEnabled) {
    for (const std::string service : {"syslog-ng", "pkg-Quillbay-syslog"}) {
        PlatformCalls::Reset();
        SystemCalls::AnswerReloadWith(true);
        EXPECT_EQ(SyslogngHupSignalSend(), 0);
        EXPECT_THAT(Messages(), IsEmpty());
        SystemCalls::AnswerReloadWith(false);
        EXPECT_EQ(SyslogngHupSignalSend(), -1);
        EXPECT_THAT(Messages(), ElementsAre(Error("Fail to send HUP signal to " + service)));
        EXPECT_THAT(Calls({"KELOSystemdReload"}),
                    ElementsAre("KELOSystemdReload " + service, "KELOSystemdReload " + service));
        fs::create_directories(root_.File("var/packages/Quillbay"));
        WriteFile(root_.File("var/packages/Quillbay/enabled"), "");
    }
}

TEST_F(Syslogng, ThrowsAwayAWorkingDatabaseBeyondItsLimit) {
    const std::string target = root_.File("target");
    const struct {
        const char *name;
        int64_t bytes; // -1 for a folder, -2 for nothing
        bool isLink;
        int32_t limit;
        int64_t result;
        bool isKept;
    } cases[] = {
        {"one byte short of 2 KiB", 2047, false, 1, 0, true},
        {"2 KiB", 2048, false, 1, 0, false},
        {"empty, negative limit", 0, false, -1, 0, false},
        {"beyond 32 bits", int64_t{5} << 40, false, 2147483647, 0, false},
        {"a link to 2 KiB", 2048, true, 1, 0, false},
        {"a link to less", 2047, true, 1, 0, true},
        {"folder", -1, false, -1, -1, true},
        {"link to a folder", -1, true, -1, -1, true},
        {"missing", -2, false, -1, -1, false},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.name);
        fs::remove_all(path_);
        fs::remove_all(target);
        PlatformCalls::Reset();
        SystemCalls::AnswerReloadWith(false); // is ignored
        WriteFile(path_ + "-wal", "");
        const std::string file = c.isLink ? target : path_;
        if (c.bytes >= 0) {
            WriteFile(file, "");
            std::error_code tooLarge;
            fs::resize_file(file, static_cast<uintmax_t>(c.bytes), tooLarge);
            if (tooLarge)
                continue; // not on every file system
        } else if (c.bytes == -1) {
            fs::create_directory(file);
        }
        if (c.isLink)
            fs::create_symlink(target, path_);
        EXPECT_EQ(SyslogngWorkingDbCheck(path_, c.limit), c.result);
        EXPECT_EQ(fs::exists(fs::symlink_status(path_)), c.isKept);
        EXPECT_TRUE(!c.isLink || fs::exists(target)) << "only the link goes";
        EXPECT_TRUE(fs::exists(path_ + "-wal"));
        EXPECT_EQ(Calls({"KELOSystemdReload"}).size(), c.result == 0 && !c.isKept ? 1u : 0u);
        const auto messages = Messages();
        if (c.bytes == -1) {
            EXPECT_THAT(messages, ElementsAre(Error("Working database is not regular file")));
        } else if (c.result != 0 || c.isKept) {
            EXPECT_THAT(messages, IsEmpty());
        }
    }
}

TEST_F(Syslogng, SwitchesADatabaseToWriteAheadLogging) {
    RunSql(path_, "CREATE TABLE logs (id)");
    EXPECT_EQ(SyslogngWorkingDbSetJouWal(path_), 0);
    EXPECT_EQ(QueryText(path_, "PRAGMA journal_mode"), "wal");
    EXPECT_THAT(Calls({"TORVCExec"}), ElementsAre("TORVCExec /bin/sh -c /usr/bin/sqlite3 " + path_ +
                                                  " \"PRAGMA journal_mode=WAL;\""));
    EXPECT_EQ(SyslogngWorkingDbSetJouWal(root_.File("no/folder.db")), -1);
    EXPECT_THAT(Messages(), ElementsAre(Error("Fail to set jounal mode as WAL, use DELETE by default")));
}

} // namespace
} // namespace kelo::test
