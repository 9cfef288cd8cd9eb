// Runs of "kelosyslog events" and "kelosyslog report". (The pages themselves are for the browser's test.)

#include "support/program_run.h"
#include "support/test.h"

namespace kelo::test {
namespace {

class Events : public testing::Test {
protected:
    Events() {
        fs::create_directories(root_.File("usr/kelo/syslog/schema"));
        fs::copy_file(KELO_SOURCE_DIR "/package/schema/kelosyslog.sql",
                      root_.File("usr/kelo/syslog/schema/kelosyslog.sql"));
    }

    ProgramResult Run(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin(), {"--root", root_.Path()});
        return RunTool(arguments);
    }
    // Five events at 2020-01-01 00:00:00, 01, ... whose levels are 0, 1, 2, 0 and 9.
    void AddEvents() const {
        ASSERT_EQ(Run({"events", "add", "volume-full"}).status, 0);
        RunSql(db_,
               "DELETE FROM log; INSERT INTO log (level, time, user, event) VALUES (0, 1577836800, 'a', 'A'),"
               "(1, 1577836801, 'b', 'B'), (2, 1577836802, 'c', 'C'), (0, 1577836803, 'd', 'D'),"
               "(9, 1577836804, '', '\x1b[31m,\"')");
    }

    TempRoot root_;
    const std::string db_ = root_.File("usr/kelo/etc/kelosyslog.db");
};

TEST_F(Events, AreListedNewestFirstByPageTimeAndLevel) {
    EXPECT_EQ(Run({"events"}).status, 3) << "and no database is created";
    EXPECT_FALSE(fs::exists(db_));
    AddEvents();
    const struct {
        std::vector<std::string> options;
        const char *ids;
    } cases[] = {
        {{}, "54321"},
        {{"-n", "2", "--offset", "3"}, "21"},
        {{"--offset", "5"}, ""},
        {{"-p", "warning"}, "32"},
        {{"-p", "!warning"}, "431"},
        {{"-p", "0", "-n", "1", "--offset", "1"}, "3"},
        {{"-S", "2020-01-01 00:00:01", "-U", "2020-01-01 00:00:02"}, "32"},
        {{"-U", "2020-01-01"}, ""},
    };
    for (const auto &[options, ids] : cases) {
        std::vector<std::string> arguments = {"events", "-o", "csv", "--no-header"};
        arguments.insert(arguments.end(), options.begin(), options.end());
        const ProgramResult result = Run(arguments);
        std::string found;
        for (size_t at = 0; at < result.out.size(); at = result.out.find("\r\n", at) + 2)
            found += result.out[at];
        EXPECT_EQ(found, ids) << testing::PrintToString(options) << result.err;
        EXPECT_EQ(result.status, found.empty() ? 1 : 0);
    }
    EXPECT_EQ(Run({"events", "-n1", "-o", "jsonl"}).out,
              "{\"id\":5,\"time\":\"2020-01-01T00:00:04+00:00\",\"level\":\"9\",\"user\":\"\","
              "\"event\":\"\\u001b[31m,\\\"\"}\n");
    EXPECT_EQ(Run({"events", "-n1", "--offset", "2"}).out, "ID  TIME                 LEVEL  USER  EVENT\n"
                                                           "3   2020-01-01 00:00:02  Error  c     C\n");
    EXPECT_EQ(Run({"events", "count"}).out, "5\n");
    EXPECT_EQ(Run({"events", "count", "-p", "error"}).out, "1\n");
}

TEST_F(Events, OfEveryKindCanBeAdded) {
    const std::vector<std::vector<std::string>> kinds = {
        {"server-start", "1.0"},           {"server-stop", "%s%n"},
        {"eps", "18446744073709551615"},   {"severity", "err", "it's"},
        {"keyword", "a\\", "b\nc"},        {"archive-start", "6"},
        {"archive-finish", "7"},           {"archive-failed", "8"},
        {"log-cleared", "/9%d.db", "ann"}, {"volume-full"}};
    for (const std::vector<std::string> &kind : kinds) {
        std::vector<std::string> arguments = {"events", "add"};
        arguments.insert(arguments.end(), kind.begin(), kind.end());
        const ProgramResult result = Run(arguments);
        EXPECT_EQ(result.status, 0) << kind[0] << result.err;
    }
    EXPECT_EQ(QueryText(db_, "SELECT group_concat(level || user || event, char(10)) FROM log"),
              "0SYSTEMServer was started [1.0].\n"
              "0SYSTEMServer was stopped [%s%n].\n"
              "0SYSTEMEvent detection: EPS is larger than [18446744073709551615].\n"
              "0SYSTEMEvent detection: Received log which severity is [err]. Log content: [it's]\n"
              "0SYSTEMEvent detection: Received log which contains [a\\]. Log content: [b\nc]\n"
              "0SYSTEMLog database [6] starts to archive.\n"
              "0SYSTEMLog database [7] has been archived.\n"
              "0SYSTEMLog database [8] is failed to archived.\n"
              "0SYSTEM/9%d.db was cleared by ann\n"
              "1SYSTEMVolume space is not enough.");
    EXPECT_EQ(Run({"events", "count"}).out, "10\n");
}

TEST_F(Events, RecordWhoClearedALogWhichMustBeOne) {
    const std::string logs = root_.File("logs.db");
    CreateLogDatabase(logs);
    EXPECT_EQ(Run({"events", "clear-log", logs}).status, 2) << "no terminal to ask on";
    WriteFile(root_.File("text"), "no database, but dear to somebody");
    EXPECT_EQ(Run({"events", "clear-log", root_.File("text"), "--yes"}).status, 3);
    EXPECT_EQ(Run({"events", "clear-log", root_.Path(), "--yes"}).status, 3);
    EXPECT_TRUE(fs::exists(logs) && fs::exists(root_.File("text")));
    EXPECT_EQ(Run({"events", "clear-log", logs, "--yes", "--user", "ann"}).status, 0);
    EXPECT_FALSE(fs::exists(logs));
    EXPECT_EQ(QueryText(db_, "SELECT event FROM log"), logs + " was cleared by ann");
    EXPECT_EQ(Run({"events", "clear-log", logs, "--yes"}).status, 3) << "gone already";
}

TEST_F(Events, AndLogsBecomeAReportThatReplacesAFileOnlyWhenItIsWhole) {
    const std::string logs = root_.File("logs.db");
    const std::string page = root_.File("page.html");
    CreateLogDatabase(logs);
    WriteFile(page, "before");
    chmod(page.c_str(), 0640);
    EXPECT_EQ(Run({"report", page, "--db", root_.File("none.db")}).status, 3);
    EXPECT_EQ(Run({"report", page, "--db", logs, "--events-db", root_.File("none.db")}).status, 3);
    EXPECT_EQ(Run({"report", page, "--db", logs, "-S", "today", "-U", "yesterday"}).status, 2);
    EXPECT_EQ(Run({"report", root_.File("no/page.html"), "--db", logs}).status, 4);
    EXPECT_EQ(ReadFile(page), "before");

    EXPECT_EQ(Run({"report", page, "--db", logs}).status, 0) << "an empty log and no event log";
    EXPECT_NE(ReadFile(page).find("There is no event log at "), std::string::npos);
    InsertSampleLogs(logs, 1000);
    AddEvents();
    EXPECT_EQ(
        Run({"report", page, "--db", logs, "--since", "2020-01-01 00:00:02", "--until", "2020-01-01 00:08"})
            .status,
        0);
    EXPECT_NE(ReadFile(page).find("<b>479</b>"), std::string::npos);
    EXPECT_EQ(ReadFile(page).find("00:00:01</td>"), std::string::npos);
    struct stat status {};
    stat(page.c_str(), &status);
    EXPECT_EQ(status.st_mode & 0777U, 0640U);
    for (const auto &file : fs::directory_iterator(root_.Path()))
        EXPECT_EQ(file.path().string().find("page.html."), std::string::npos) << "left behind";
}

} // namespace
} // namespace kelo::test
