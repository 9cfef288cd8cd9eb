// Runs of "kelosyslog events" and "kelosyslog report". (The pages themselves are for the browser's test.)

#include "support/program_test.h"

namespace kelo::test {
namespace {

class Events : public ProgramTest {
protected:
    // Five events at 2020-01-01 00:00:00, 01, ... whose levels are 0, 1, 2, 0 and 9.
    void AddEvents() const {
        CreateLogDatabase(events_, "kelosyslog.sql");
        RunSql(events_, "INSERT INTO log (level, time, user, event) VALUES (0, 1577836800, 'a', 'A'),"
                        "(1, 1577836801, 'b', 'B'), (2, 1577836802, 'c', 'C'), (0, 1577836803, 'd', 'D'),"
                        "(9, 1577836804, '', '\x1b[31m,\"')");
    }
};

TEST_F(Events, AreListedNewestFirstByPageTimeAndLevel) {
    AddEvents();
    const std::pair<const char *, std::string> cases[] = {
        {"", "54321"},
        {"-n 2 --offset 3", "21"},
        {"--offset 5", ""},
        {"-p warning", "32"},
        {"-p '!warning'", "431"},
        {"-p 0 -n 1 --offset 1", "3"},
        {"-S '2020-01-01 00:00:01' -U '2020-01-01 00:00:02'", "32"},
        {"-U 2020-01-01", ""},
    };
    for (const auto &[options, ids] : cases) {
        const ProgramResult result = Run(std::string("events -o csv --no-header ") + options);
        std::string found;
        for (size_t at = 0; at < result.out.size(); at = result.out.find("\r\n", at) + 2)
            found += result.out[at];
        EXPECT_EQ(found, ids) << options << result.err;
        EXPECT_EQ(result.status, found.empty() ? 1 : 0);
    }
    Expect("events -n1 -o jsonl", 0,
           "{\"id\":5,\"time\":\"2020-01-01T00:00:04+00:00\",\"level\":\"9\",\"user\":\"\","
           "\"event\":\"\\u001b[31m,\\\"\"}\n");
    Expect("events -n1 --offset 2", 0,
           "ID  TIME                 LEVEL  USER  EVENT\n3   2020-01-01 00:00:02  Error  c     C\n");
    Expect("events count", 0, "5\n");
    Expect("events count -p error", 0, "1\n");
}

TEST_F(Events, AreFollowedAlsoIntoAnotherFile) {
    AddEvents();
    const std::string columns = "events -f -o csv --no-header ";
    Expect(columns + "-n 2 --idle 0 -p warning", 0,
           "2,2020-01-01T00:00:01+00:00,Warning,b,B\r\n"
           "3,2020-01-01T00:00:02+00:00,Error,c,C\r\n");
    Expect("events -f --until @0", 1, "");
    FILE *stream =
        popen(InFolder(root_.Path(), kProgram + columns + "-n 1 -p '!information' 2>err").c_str(), "r");
    const auto nextLine = [stream] {
        char line[99] = "";
        return std::string(fgets(line, sizeof line, stream) != nullptr ? line : "");
    };
    EXPECT_EQ(nextLine(), "3,2020-01-01T00:00:02+00:00,Error,c,C\r\n");
    RunSql(events_, "INSERT INTO log (level, time, user, event) VALUES (0, 9, 'x', 'X'), (2, 8, 'y', 'Y')");
    EXPECT_EQ(nextLine(), "7,1970-01-01T00:00:08+00:00,Error,y,Y\r\n") << "of an earlier time";
    CreateLogDatabase(root_.File("fresh"), "kelosyslog.sql");
    RunSql(root_.File("fresh"), "INSERT INTO log (level, time, user, event) VALUES (1, 7, 'z', 'Z')");
    fs::rename(root_.File("fresh"), events_);
    EXPECT_EQ(nextLine(), "1,1970-01-01T00:00:07+00:00,Warning,z,Z\r\n");
    EXPECT_EQ(pclose(stream), 0) << "nobody reads any more";
    EXPECT_EQ(ReadFile(root_.File("err")), "");
}

TEST_F(Events, OfEveryKindCanBeAdded) {
    for (const char *kind :
         {"server-start 1.0", "server-stop %s%n", "eps 18446744073709551615", "severity err \"it's\"",
          "keyword 'a\\' 'b\nc'", "archive-start 6", "archive-finish 7", "archive-failed 8",
          "log-cleared /9%d.db ann", "volume-full"})
        Expect(std::string("events add ") + kind, 0);
    EXPECT_EQ(RunSql(events_, "SELECT group_concat(level || user || event, char(10)) FROM log"),
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
}

TEST_F(Events, TellWhyTheyCannotBeAddedOrRead) {
    const std::string folder = root_.File("usr/kelo/etc"), schema = root_.File("usr/kelo/syslog/schema");
    const auto addError = [&] { return Run("events add volume-full").err; };
    fs::remove_all(folder);
    WriteFile(folder, "");
    EXPECT_THAT(addError(), HasSubstr("usr/kelo/etc: Not a directory\n"));
    fs::remove(folder);
    fs::rename(schema, schema + ".away");
    EXPECT_THAT(addError(), HasSubstr("kelosyslog.sql: No such file or directory\n"));
    fs::remove(events_);
    AddEvents();
    RunSql(events_, "ALTER TABLE log RENAME TO logs");
    EXPECT_THAT(addError(), HasSubstr("kelosyslog.db: no such table: log\n"));
    Expect("events", 3);
    WriteFile(events_, "SQLite format 3" + std::string(1000, '\0'));
    EXPECT_THAT(addError(), HasSubstr("kelosyslog.db: it is damaged (file is not a database)\n"));
}

TEST_F(Events, RecordWhoClearedALog) {
    CreateLogDatabase(logs_);
    Expect("events clear-log " + logs_ + " --yes --user ann", 0);
    EXPECT_FALSE(fs::exists(logs_));
    EXPECT_EQ(RunSql(events_, "SELECT event FROM log"), logs_ + " was cleared by ann");
}

TEST_F(Events, AndLogsBecomeAReportThatReplacesAFileOnlyWhenItIsWhole) {
    const std::string page = root_.File("page.html");
    CreateLogDatabase(logs_);
    WriteFile(page, "before");
    chmod(page.c_str(), 0640);
    Expect("report page.html", 0); // an empty log and no event log
    EXPECT_THAT(ReadFile(page), HasSubstr("There is no event log at "));
    InsertSampleLogs(logs_, 1000);
    AddEvents();
    Expect("report page.html --since '2020-01-01 00:00:02' --until '2020-01-01 00:08'", 0);
    EXPECT_THAT(ReadFile(page), AllOf(HasSubstr("<b>479</b>"), Not(HasSubstr("00:00:01</td>"))));
    struct stat status {};
    stat(page.c_str(), &status);
    EXPECT_EQ(status.st_mode & 0777U, 0640U);
    const std::string before = ReadFile(page);
    RunSql(events_, "WITH n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 3000) "
                    "INSERT INTO log SELECT NULL, 1, 1, 'SYSTEM', 'event' FROM n");
    const ProgramResult full = RunIn(root_.Path(), std::string("trap '' XFSZ; ulimit -f 64; ") + kProgram +
                                                       "events export page.html");
    EXPECT_EQ(full.status, 4);
    EXPECT_THAT(full.err, HasSubstr("cannot write page.html"));
    EXPECT_TRUE(ReadFile(page) == before);
    for (const auto &file : fs::directory_iterator(root_.Path()))
        EXPECT_THAT(file.path().string(), Not(HasSubstr("page.html."))) << "left behind";
}

} // namespace
} // namespace kelo::test
