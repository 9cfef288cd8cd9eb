// A volume that is nearly full: what is reported as done is in the file, and what is not can be done later.

#include <sys/statvfs.h>

#include "faults/operations.h"
#include "kelosyslog/accounting.h"
#include "kelosyslog/dbwriter.h"
#include "kelosyslog/logger.h"
#include "support/volume.h"

namespace kelo::test {
namespace {

constexpr int kLogs = 300;

// Something that is written to an existing database. `write` may be called again, and returns whether all of
// it is in the file.
struct Write {
    const char *schema;
    const char *file;
    const char *done; // a query that gives "1" when all of it is there once, and "" or "0" when nothing is
    std::function<std::function<bool()>(const std::string &path)> prepare;

    friend void PrintTo(const Write &write, std::ostream *out) { *out << write.file; }
};

std::function<bool()> Flush(const std::string &) {
    const auto accounting = std::make_shared<AccountingManager>();
    for (int i = 0; i < kLogs; ++i)
        accounting->LogInc("device-" + std::to_string(i));
    now += 1;
    accounting->CurEpsUpdate();
    return [accounting] { return accounting->AccoutingFlush2DB() == 0; };
}

std::function<bool()> AddEvent(const std::string &) {
    return [] { return Logger().LogAddVolFull() == 0; };
}

std::function<bool()> Store(const std::string &path) {
    std::vector<_SYSLOG_LOG_DATA_tag> logs;
    for (int i = 0; i < kLogs; ++i)
        logs.push_back(SampleLog(i));
    return [path, logs] { return SyslogDBWriter(path).Store(logs.data(), logs.size()) == 0; };
}

const Write kWrites[] = {
    {"accinfo.sql", "var/log/kelolog/.KELOACCOUNTDB",
     "SELECT (SELECT count(*) FROM eps) / 300.0 * (SELECT sum(count) FROM histogram) / 300.0", Flush},
    {"kelosyslog.sql", "usr/kelo/etc/kelosyslog.db", "SELECT count(*) FROM log", AddEvent},
    {"logs.sql", "var/log/kelosyslog/logs.db", "SELECT count(*) / 300.0 FROM logs", Store},
};

class LittleRoom : public LibraryTest, public testing::WithParamInterface<Write> {};

TEST_P(LittleRoom, SaysDoneOnlyWhenItIsAndWritesTheRestLater) {
    const Volume volume(root_.Path(), "2m");
    if (!volume.IsMounted())
        GTEST_SKIP() << "may not mount";
    const std::string path = root_.File(GetParam().file);
    const std::string filler = root_.File("filler");
    const auto share = [&] { return std::atof(RunSql(path, GetParam().done).c_str()); };
    std::set<bool> seen;
    for (size_t roomKib = 0; roomKib <= 512; roomKib += 4) {
        SCOPED_TRACE(std::to_string(roomKib) + " KiB");
        fs::remove_all(fs::path(path).parent_path());
        CreateLogDatabase(path, GetParam().schema);
        const auto write = GetParam().prepare(path);
        struct statvfs space {};
        ASSERT_EQ(statvfs(root_.Path().c_str(), &space), 0);
        WriteFile(filler, std::string(space.f_bavail * space.f_frsize - (roomKib << 10), 'x'));
        const bool isDone = write();
        seen.insert(isDone);
        fs::remove(filler);
        EXPECT_EQ(share(), isDone ? 1 : 0);
        if (!isDone) {
            EXPECT_EQ(SyslogFailureGet()->kind, KELO_FAILURE_FULL);
            EXPECT_TRUE(write());
        }
        EXPECT_EQ(share(), 1);
        EXPECT_EQ(RunSql(path, "PRAGMA integrity_check"), "ok");
    }
    EXPECT_EQ(seen.size(), 2U);
}

INSTANTIATE_TEST_SUITE_P(Writes, LittleRoom, testing::ValuesIn(kWrites), [](const auto &write) {
    return std::string(write.param.schema, std::string_view(write.param.schema).find('.'));
});

} // namespace
} // namespace kelo::test
