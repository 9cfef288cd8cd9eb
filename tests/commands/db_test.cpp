// kelosyslog db on real files.

#include "support/program_run.h"
#include "support/test.h"

namespace kelo::test {
namespace {

const std::string kArchive = KELO_SOURCE_DIR "/package/schema/archive.sql";

class DbCommand : public testing::Test {
protected:
    // Runs "db COMMAND... --db FILE" under a root where no syslog-ng runs.
    ProgramResult Run(std::vector<std::string> command, const std::string &file) const {
        command.insert(command.begin(), "db");
        command.insert(command.end(), {"--db", root_.File(file), "--root", root_.Path()});
        return RunTool(command);
    }

    TempRoot root_;
};

TEST_F(DbCommand, CreatesDescribesAndNamesADatabase) {
    const std::string file = "neue Logs/it's.db";
    EXPECT_EQ(Run({"create", "--schema", kArchive}, file).status, 0);
    EXPECT_EQ(Run({"create"}, file).status, 1) << "it is there";
    InsertSampleLogs(root_.File(file), 3);
    EXPECT_EQ(Run({"set-device", "it's 50%"}, file).status, 0);
    const std::string info = Run({"info", "-o", "json"}, file).out;
    for (const char *fact :
         {"\"generation\": 1", "\"journal_mode\": \"wal\"", "\"rows\": 3",
          "\"first_log\": \"2020-01-01T00:00:00+00:00\"", "\"last_log\": \"2020-01-01T00:00:02+00:00\"",
          "\"db_info_device\": \"it's 50%\""})
        EXPECT_NE(info.find(fact), std::string::npos) << fact << " in " << info;
    EXPECT_EQ(Run({"create"}, "working.db").status, 0);
    EXPECT_EQ(Run({"set-device", "x"}, "working.db").status, 3) << "it has no db_info";
    EXPECT_EQ(QueryText(root_.File("working.db"), "SELECT count(*) FROM logs"), "0");
}

TEST_F(DbCommand, RefusesWhatItCannotDoAndLeavesNothing) {
    WriteFile(root_.File("bad.sql"), "CREATE TABEL x (y);");
    WriteFile(root_.File("text"), std::string(5000, 'x'));
    const struct {
        std::vector<std::string> command;
        std::string file;
        int status;
        std::string named;
    } cases[] = {
        {{"create"}, "$(touch hacked).db", 2, "$(touch hacked).db"},
        {{"create", "--schema", root_.File("no.sql")}, "a.db", 2, "no.sql"},
        {{"create", "--schema", root_.File("bad.sql")}, "text/a.db", 3, "text"},
        {{"create", "--schema", "/tmp/a b.sql"}, "a.db", 2, "/tmp/a b.sql"},
        {{"info"}, "none.db", 3, "none.db"},
        {{"check"}, "text", 3, "text"},
        {{"limit", "-1"}, "text", 2, "-1"},
        {{"limit", "2147483648"}, "text", 2, "2147483648"},
        {{"quarantine"}, "text", 2, "--yes"},
        {{"quarantine", "--yes"}, "none.db", 3, "none.db"},
        {{"info", "-o", "csv"}, "text", 2, "csv"},
    };
    for (const auto &c : cases) {
        const ProgramResult result = Run(c.command, c.file);
        EXPECT_EQ(result.status, c.status) << c.named;
        EXPECT_NE(result.err.find(c.named), std::string::npos) << result.err;
        EXPECT_EQ(result.out, "");
    }
    EXPECT_FALSE(fs::exists(root_.File("none.db")) || fs::exists(root_.File("a.db")));
    EXPECT_TRUE(fs::exists(root_.File("text")));
}

TEST_F(DbCommand, ChecksAndPutsAsideWhatIsDamaged) {
    CreateLogDatabase(root_.File("logs.db"));
    InsertSampleLogs(root_.File("logs.db"), 500);
    EXPECT_EQ(Run({"wal"}, "logs.db").status, 0);
    EXPECT_EQ(Run({"check"}, "logs.db").status, 0);
    RunSql(root_.File("logs.db"), "PRAGMA ignore_check_constraints = ON; CREATE TABLE c (x CHECK (x > 0)); "
                                  "INSERT INTO c VALUES (0)");
    const ProgramResult unsound = Run({"check"}, "logs.db");
    EXPECT_EQ(unsound.status, 3);
    EXPECT_NE(unsound.out.find("sound     no\nproblems  CHECK constraint failed in c\n"), std::string::npos)
        << unsound.out;
    EXPECT_EQ(Run({"wal"}, "logs.db").status, 0);
    std::string content = ReadFile(root_.File("logs.db"));
    for (size_t page = 8192; page + 4096 < content.size(); page += 4096)
        content.replace(page, 8, 8, '\xff');
    WriteFile(root_.File("logs.db"), content);
    const ProgramResult check = Run({"check", "-o", "json"}, "logs.db");
    EXPECT_EQ(check.status, 3);
    EXPECT_NE((check.out + check.err).find("malformed"), std::string::npos) << check.out << check.err;
    EXPECT_EQ(ReadFile(root_.File("logs.db")), content);

    const ProgramResult quarantine = Run({"quarantine", "-y"}, "logs.db");
    EXPECT_EQ(quarantine.status, 3) << "syslog-ng could not be reloaded";
    EXPECT_NE(quarantine.out.find("reloaded  no"), std::string::npos);
    EXPECT_EQ(ReadFile(root_.File("logs.db.corrupt")), content);
    EXPECT_EQ(Run({"limit", "1000000"}, "logs.db.corrupt").status, 1);
    EXPECT_EQ(Run({"limit", "8"}, "logs.db.corrupt").status, 0);
    EXPECT_FALSE(fs::exists(root_.File("logs.db.corrupt")));
}

} // namespace
} // namespace kelo::test
