// kelosyslog db on real files.

#include "support/program_test.h"

namespace kelo::test {
namespace {

using DbCommand = ProgramTest;

TEST_F(DbCommand, CreatesDescribesAndNamesADatabase) {
    const std::string file = root_.File("neue Logs/it's.db");
    const std::string here = " --db \"neue Logs/it's.db\"";
    Expect("db create --schema $PWD/usr/kelo/syslog/schema/archive.sql" + here, 0);
    Expect("db create" + here, 1);
    InsertSampleLogs(file, 3);
    Expect("db set-device \"it's 50%\"" + here, 0);
    const std::string info = Run("db info -o json" + here).out;
    for (const char *fact :
         {"\"generation\": 1", "\"journal_mode\": \"wal\"", "\"rows\": 3",
          "\"first_log\": \"2020-01-01T00:00:00+00:00\"", "\"last_log\": \"2020-01-01T00:00:02+00:00\"",
          "\"db_info_device\": \"it's 50%\""})
        EXPECT_THAT(info, HasSubstr(fact));
    Expect("db create", 0);
    Expect("db set-device x", 3); // it has no db_info
    EXPECT_EQ(RunSql(logs_, "SELECT count(*) FROM logs"), "0");
}

TEST_F(DbCommand, CreatesAsTheOwnerOfTheFolder) {
    if (geteuid() != 0)
        GTEST_SKIP() << "only root acts for others";
    // The sqlite3 tool obeys what is beside a database, so in a folder of another user it must not be root's.
    constexpr uid_t kOther = 64203;
    const std::string own = root_.File("own");
    fs::create_directories(own);
    ASSERT_EQ(chmod(root_.Path().c_str(), 0755), 0);
    ASSERT_EQ(chown(own.c_str(), kOther, kOther), 0);
    WriteFile(root_.File("schema.sql"), ".shell id -u >" + own + "/user\nCREATE TABLE logs (id);");
    Expect("db create --db own/sub/x.db --schema " + root_.File("schema.sql"), 0);
    EXPECT_EQ(ReadFile(own + "/user"), "64203\n");
    Expect("db create --db own/y.db", 0); // from the schema that only its creator can read otherwise
    ASSERT_EQ(chown(fs::path(events_).parent_path().c_str(), kOther, kOther), 0);
    Expect("events add server-start x", 0);
}

TEST_F(DbCommand, ChecksAndPutsAsideWhatIsDamaged) {
    CreateLogDatabase(logs_);
    InsertSampleLogs(logs_, 500);
    Expect("db check", 0);
    Expect("db quarantine -y", 1);
    EXPECT_TRUE(fs::exists(logs_)) << "a sound database stays";
    RunSql(logs_, "PRAGMA ignore_check_constraints = ON; CREATE TABLE c (x CHECK (x > 0)); "
                  "INSERT INTO c VALUES (0)");
    const ProgramResult unsound = Run("db check");
    EXPECT_EQ(unsound.status, 3);
    EXPECT_THAT(unsound.out, HasSubstr("sound     no\nproblems  CHECK constraint failed in c\n"));
    Expect("db wal", 0);
    const std::string content = DamagePages(logs_);
    const ProgramResult check = Run("db check -o json");
    EXPECT_EQ(check.status, 3);
    EXPECT_THAT(check.out + check.err, HasSubstr("malformed"));
    EXPECT_TRUE(ReadFile(logs_) == content);

    fs::create_directories(logs_ + ".corrupt/x");
    const ProgramResult quarantine = Run("db quarantine -y");
    EXPECT_EQ(quarantine.status, 3) << "syslog-ng could not be reloaded";
    EXPECT_THAT(quarantine.out, HasSubstr("reloaded  no"));
    EXPECT_TRUE(ReadFile(logs_ + ".corrupt") == content);
    EXPECT_TRUE(fs::exists(logs_ + ".corrupt.1/x")) << "what had the name is kept";
    Expect("count", 1, "0\n");
    RunSql(logs_, "DROP TABLE logs; VACUUM; PRAGMA journal_mode = WAL"); // as syslog-ng opens it
    EXPECT_THAT(Run("count").err, HasSubstr("it has no table yet"));
    EXPECT_THAT(Run("status --control none").out, HasSubstr("logs        good"));
    Expect("db limit 1000000 --db var/log/kelosyslog/logs.db.corrupt", 1);
    fs::create_symlink(logs_ + ".corrupt", root_.File("link"));
    Expect("db limit 8 --db link", 0);
    EXPECT_FALSE(fs::exists(logs_ + ".corrupt"));
    EXPECT_TRUE(fs::is_symlink(root_.File("link"))) << "the database is removed, not the way to it";
}

TEST_F(DbCommand, ShowsBuildsAndRemovesTheIndexForKeywords) {
    CreateLogDatabase(logs_);
    InsertSampleLogs(logs_, 17'000);
    Expect("db index", 1);
    Expect("db index --build", 0);
    EXPECT_THAT(Run("db index -o json").out, HasSubstr("\"last_id\": 16383"));
    EXPECT_THAT(Run("status -o json").out, HasSubstr("\"unindexed_rows\":617"));
    Expect("db index --remove", 0);
    Expect("db index --remove", 1);
    Expect("db index --build --remove", 2);
    RunSql(root_.File("plain.db"), "CREATE TABLE logs(id INTEGER PRIMARY KEY, msg)");
    Expect("db index --build --db plain.db", 3);
    EXPECT_FALSE(fs::exists(logs_ + "-skip"));
}

} // namespace
} // namespace kelo::test
