#include "base/sqlite.h"

#include "support/test.h"

namespace kelo::test {
namespace {

using tool::SqliteConnection, tool::SqliteMode;

// A write-ahead log is opened by its name, which belongs to another file by now.
TEST(Sqlite, KeepsToItsFileWhenThatIsMoved) {
    const TempRoot root;
    const std::string path = root.File("logs.db");
    CreateLogDatabase(path);
    InsertLogsIntoWal(path, {SampleLog(1), SampleLog(2)});
    SqliteConnection moved(path, {.mode = SqliteMode::kWrite});
    for (const char *file : {"", "-wal", "-shm"})
        fs::rename(path + file, path + ".corrupt" + file);
    CreateLogDatabase(path);
    SqliteConnection fresh(path, {.mode = SqliteMode::kWrite});
    fresh.Run("INSERT INTO logs(msg) VALUES('fresh')");
    EXPECT_EQ(moved.Number("SELECT count(*) FROM logs"), 2);
    moved.Run("INSERT INTO logs(msg) VALUES('moved')");
    EXPECT_EQ(fresh.Number("SELECT count(*) FROM logs"), 1);
    EXPECT_EQ(fresh.Text("PRAGMA integrity_check"), "ok");
}

} // namespace
} // namespace kelo::test
