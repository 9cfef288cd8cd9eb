// kelosyslog archive as a user runs it.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <unistd.h>

#include <filesystem>

#include "support/log_database.h"
#include "support/program_run.h"
#include "support/temp_root.h"

namespace kelo::test {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

class ArchiveProgram : public testing::Test {
protected:
    ArchiveProgram() {
        fs::create_directories(root_.File("var/log/kelolog"));
        fs::create_directories(root_.File("usr/kelo/syslog"));
        fs::copy(KELO_SOURCE_DIR "/package/schema", root_.File("usr/kelo/syslog/schema"));
        CreateLogDatabase(source_);
        InsertSampleLogs(source_, 500);
    }
    ProgramResult Run(std::vector<std::string> arguments, const std::string &command = "archive") const {
        arguments.insert(arguments.begin(), {command, "--root", root_.Path()});
        return RunTool(arguments);
    }
    // The ends of the events' texts.
    std::string Events() const {
        return QueryText(root_.File("usr/kelo/etc/kelosyslog.db"),
                         "SELECT group_concat(substr(event, length(event) - 8), ',') FROM log");
    }

    TempRoot root_;
    std::string source_ = root_.File("var/log/kelolog/logs.db");
    std::string folder_ = root_.File("var/log/kelolog/archive");
};

TEST_F(ArchiveProgram, ArchivesListsSearchesAndPrunes) {
    EXPECT_EQ(Run({"--remove-archived"}).status, 2) << "nobody to ask";
    EXPECT_EQ(Run({"--remove-archived", "--dry-run"}).status, 0);
    EXPECT_FALSE(fs::exists(folder_));
    EXPECT_EQ(Run({"--device", "host07", "--remove-archived", "--yes"}).status, 0);
    EXPECT_EQ(QueryText(source_, "SELECT count(*) || ' ' || sum(host = 'host07') FROM logs"), "490 0");
    EXPECT_EQ(Run({}).status, 0);
    EXPECT_EQ(Run({"--device", "none"}).status, 1);
    EXPECT_EQ(Events(), " archive.,archived., archive.,archived.") << "without logs there is no event";

    const std::string name = "host07_2020-01-01_2020-01-01";
    EXPECT_EQ(Run({"--log", name}, "count").out, "10\n");
    EXPECT_EQ(Run({"--log", name + ".db", "-n", "1", "--fields", "id", "-o", "csv"}, "search").out,
              "id\r\n458\r\n");
    EXPECT_THAT(Run({"--log", "host08"}, "count").err, HasSubstr("'kelosyslog archive --list'"));
    EXPECT_THAT(Run({"--list", "-o", "csv"}).out,
                HasSubstr(name + ".db,host07,2020-01-01T00:00:07+00:00,2020-01-01T00:07:37+00:00,10,"));

    EXPECT_EQ(Run({"--prune", "--keep-size", "1", "--yes"}).status, 0);
    EXPECT_EQ(Run({"--list"}).status, 1);
}

TEST_F(ArchiveProgram, RemovesWhatAnEarlierRunLeft) {
    ASSERT_EQ(Run({"--device", "host07"}).status, 0);
    WriteFile(folder_ + "/.removing-host07_2020-01-01_2020-01-01.db", source_);
    const ProgramResult result = Run({"--remove-archived", "--yes", "--device", "host07"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(QueryText(source_, "SELECT count(*) || ' ' || sum(host = 'host07') FROM logs"), "490 0");
    EXPECT_FALSE(fs::exists(folder_ + "/.removing-host07_2020-01-01_2020-01-01.db"));
}

TEST_F(ArchiveProgram, NamesWhatItCannotDo) {
    const std::string damaged = root_.File("damaged.db");
    RunSql(source_, "PRAGMA wal_checkpoint(TRUNCATE)");
    std::string content = ReadFile(source_);
    for (size_t page = 8192; page + 4096 < content.size(); page += 4096)
        content.replace(page, 8, 8, '\xff');
    WriteFile(damaged, content);
    CreateLogDatabase(root_.File("checked.db"));
    InsertSampleLogs(root_.File("checked.db"), 1);
    RunSql(root_.File("checked.db"),
           "PRAGMA ignore_check_constraints = ON; CREATE TABLE c (x CHECK (x > 0)); "
           "INSERT INTO c VALUES (0)");
    RunSql(root_.File("narrow.db"),
           "CREATE TABLE logs (id INTEGER PRIMARY KEY); INSERT INTO logs VALUES (1)");
    fs::create_symlink("loop", root_.File("loop"));
    WriteFile(root_.File("text"), std::string(5000, 'x'));
    fs::create_directory(root_.File("busy"));
    const int busy = open(root_.File("busy").c_str(), O_RDONLY | O_CLOEXEC);
    flock(busy, LOCK_EX);
    const struct {
        std::vector<std::string> arguments;
        int status;
        std::string named;
    } cases[] = {
        {{"--to", root_.File("none")}, 4, root_.File("none")},
        {{"--to", root_.File("text")}, 4, root_.File("text")},
        {{"--to", root_.File("busy")}, 4, root_.File("busy")},
        {{"--db", damaged}, 3, damaged},
        {{"--db", root_.File("checked.db")}, 3, "checked.db is damaged"},
        {{"--db", damaged + "x"}, 3, damaged + "x"},
        {{"--db", root_.File("loop/x.db")}, 3, "cannot read " + root_.File("loop/x.db")},
        {{"--db", root_.File("narrow.db")}, 3, root_.File("narrow.db") + " cannot be archived"},
        {{"--db", root_.File("text")}, 3, root_.File("text")},
        {{"--log", "ftpxfer"}, 2, "ftpxfer"},
        {{"--keep", "+1d", "--yes"}, 2, "+1d"},
        {{"--keep-size", "much", "--yes"}, 2, "much"},
        {{"--prune"}, 2, "--keep"},
        {{"--list", "--device", "a"}, 2, "--device"},
    };
    for (const auto &c : cases) {
        const ProgramResult result = Run(c.arguments);
        EXPECT_EQ(result.status, c.status) << c.named;
        EXPECT_THAT(result.err, HasSubstr(c.named));
    }
    close(busy);
    EXPECT_TRUE(!fs::exists(folder_) || fs::is_empty(folder_));
    EXPECT_EQ(ReadFile(damaged), content);
    EXPECT_FALSE(fs::exists(damaged + ".corrupt"));
    EXPECT_THAT(Events(), testing::EndsWith("archived.")) << "failed ones are recorded";
}

} // namespace
} // namespace kelo::test
