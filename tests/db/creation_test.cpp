// Creating a database under adverse conditions.

#include "db/db_fixture.h"
#include "db/killed_process.h"
#include "support/volume.h"

namespace kelo::test {
namespace {

class Creation : public DbTest {
protected:
    const std::string folder_ = root_.File("db");
    const std::string file_ = folder_ + "/logs.db";
    const std::string schema_ = BuildPath("package/schema/archive.sql");

    static constexpr int kNotConnected = 1;

    // Connects and stores a row. Returns 0, kNotConnected or another number for a failure.
    int Store() const {
        DBHandler db(file_, schema_);
        const DBConnectionScope scope(db);
        if (db.DBCon() != 0)
            return kNotConnected;
        return db.DBExecute("INSERT INTO logs(msg) VALUES('x')") == 0 ? 0 : 2;
    }
    std::vector<std::string> Files() const {
        std::vector<std::string> names;
        for (const auto &file : fs::directory_iterator(folder_))
            names.push_back(file.path().filename());
        return names;
    }
    void ExpectDatabaseWith(int rows) const {
        EXPECT_EQ(RunSql(file_, "SELECT count(*) FROM logs"), std::to_string(rows));
        EXPECT_EQ(RunSql(file_, "SELECT count(*) FROM db_info"), "1");
        EXPECT_EQ(RunSql(file_, "PRAGMA journal_mode"), "wal");
        EXPECT_THAT(Files(), ElementsAre("logs.db"));
    }
};

// Each call with one victim in turn; with all of them where KELO_EVERY_VICTIM is set.
TEST_F(Creation, BrokenOffAtAnyCallLeavesNothingOrAll) {
    const int victims = std::getenv("KELO_EVERY_VICTIM") != nullptr ? 3 : 1;
    const auto create = [this] { DBHandler(file_, schema_).DBCon(); };
    for (int run = 0;; ++run) {
        SCOPED_TRACE("run " + std::to_string(run));
        const int number = 1 + run / victims;
        const auto status =
            KillAtCall(number, static_cast<Victim>(run % 3), create, [this] { return Store(); });
        if (!status) {
            EXPECT_GT(number, 50) << "hardly any call was seen";
            return;
        }
        EXPECT_EQ(*status, 0);
        ExpectDatabaseWith(1);
        ASSERT_FALSE(HasFailure());
        fs::remove_all(folder_);
    }
}

TEST_F(Creation, LeavesNothingOnAFullDiskAndSucceedsWhenThereIsRoom) {
    for (const size_t roomKib : {0, 4, 8, 12, 16, 20, 24, 28, 32, 36, 40, 44, 48, 52, 56, 60, 64}) {
        SCOPED_TRACE(roomKib);
        const Volume volume(folder_, "256k");
        if (!volume.IsMounted())
            GTEST_SKIP() << "may not mount";
        const std::string filler = folder_ + "/filler";
        WriteFile(filler, std::string((256 - roomKib) << 10, 'x'));
        const int status = Store();
        if (status == kNotConnected)
            EXPECT_THAT(Files(), ElementsAre("filler"));
        else
            EXPECT_GT(roomKib, 8u);
        fs::remove(filler);
        EXPECT_EQ(Store(), 0);
        ExpectDatabaseWith(status == 0 ? 2 : 1);
    }
}

TEST_F(Creation, RefusesWhatIsNoPlaceForADatabase) {
    const Volume readOnly(folder_ + "/read-only", "256k", MS_RDONLY);
    fs::create_directory(folder_ + "/folder.db");
    fs::create_symlink("nowhere", folder_ + "/link.db");
    ASSERT_EQ(mknod((folder_ + "/socket.db").c_str(), S_IFSOCK | 0600, 0), 0);
    const auto names = Files();
    for (const std::string name :
         {"a\"b", "$(touch pwned)", "`touch pwned`", "a\\b", "a\nb", "folder/$x/logs.db", "link.db",
          "read-only/logs.db", "folder.db", "socket.db"}) {
        SCOPED_TRACE(name);
        const std::string path = folder_ + "/" + name;
        if (name.starts_with("read-only") && !readOnly.IsMounted())
            continue;
        EXPECT_EQ(DBHandler(path, schema_).DBCon(), -1);
        std::vector<std::string> expected = {"Fail to open db: " + path};
        if (!fs::exists(path))
            expected = {"Fail to create database: " + path + "," + schema_,
                        "Fail to create database: " + path};
        if (name == "link.db")
            expected.insert(expected.begin(), path + " is a link to nothing");
        EXPECT_EQ(Take(), expected);
        EXPECT_EQ(Files(), names);
    }
    EXPECT_FALSE(fs::exists("pwned"));
}

} // namespace
} // namespace kelo::test
