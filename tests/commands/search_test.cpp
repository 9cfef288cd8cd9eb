// Runs of the built program.

#include <thread>

#include "support/program_run.h"
#include "support/test.h"

namespace kelo::test {
namespace {

using Arguments = std::vector<std::string>;

class Program : public testing::Test {
protected:
    Program() { CreateLogDatabase(db_); }

    ProgramResult On(const std::string &db, Arguments arguments) const {
        arguments.insert(arguments.end(), {"--db", db});
        return RunTool(arguments);
    }
    ProgramResult OnSample(Arguments arguments) const { return On(db_, std::move(arguments)); }

    // The line that reports a failure: exactly one, with the program's name.
    static std::string OnlyLine(const ProgramResult &result) {
        EXPECT_EQ(std::count(result.err.begin(), result.err.end(), '\n'), 1) << result.err;
        EXPECT_EQ(result.err.rfind("kelosyslog: ", 0), 0U) << result.err;
        EXPECT_EQ(result.out, "");
        return result.err;
    }

    TempRoot root_;
    const std::string db_ = root_.File("logs.db");
};

TEST_F(Program, PrintsTheNewestLogsOldestFirstAndTellsMatchFromNoMatch) {
    InsertSampleLogs(db_, 100);
    RunSql(db_, "DELETE FROM logs WHERE id BETWEEN 96 AND 98");
    const Arguments page = {"search", "-n", "3", "-o", "csv", "--no-header", "--fields", "id,time"};
    EXPECT_EQ(OnSample(page).out, "95,2020-01-01T00:01:34+00:00\r\n99,2020-01-01T00:01:38+00:00\r\n"
                                  "100,2020-01-01T00:01:39+00:00\r\n");
    EXPECT_EQ(OnSample({"search", "-r", "-n", "2", "--offset", "1", "-o", "csv", "--fields", "id"}).out,
              "id\r\n99\r\n95\r\n");
    const ProgramResult nothing = OnSample({"search", "-H", "nowhere"});
    EXPECT_EQ(nothing.status, 1);
    EXPECT_EQ(nothing.out + nothing.err, "");
    EXPECT_EQ(RunTool({{"search", "-n1", "--db", db_, "-o", "short"}, {"TZ=IST-5:30"}}).out.substr(0, 15),
              "Jan 01 05:31:39");
    EXPECT_EQ(OnSample({"count", "-H", "delete"}).status, 1);
    EXPECT_EQ(OnSample({"count"}).out, "97\n");
    EXPECT_EQ(OnSample({"count", "--estimate"}).out, "100\n");
    EXPECT_EQ(OnSample({"count", "-g", "*"}).out, "97\n");
    EXPECT_EQ(OnSample({"count", "-g", "/nothing like this/"}).status, 1);
    EXPECT_EQ(OnSample({"values", "fac", "-n", "2", "--offset", "1", "-o", "json"}).out,
              "[\n\"daemon\",\n\"kern\"\n]\n");
}

TEST_F(Program, NamesTheOptionAndValueOfAWrongCommandLine) {
    InsertSampleLogs(db_, 10);
    const struct {
        Arguments arguments;
        std::string named;
    } kCases[] = {
        {{"search", "-n", "0"}, "--lines: '0'"},
        {{"search", "--since", "2021-02-30"}, "--since: '2021-02-30'"},
        {{"search", "-o", "xml"}, "--output: 'xml'"},
        {{"search", "--fields", "id,nose"}, "--fields: unknown field 'nose'"},
        {{"search", "-g", "/(/"}, "--grep: '/(/'"},
        {{"search", "-f", "-r"}, "--follow"},
        {{"search", "--table", "transfer_log", "-g", "x"}, "--grep: table transfer_log"},
        {{"values", "colour"}, "'colour'"},
        {{"delete"}, "--all"},
        // Each of these would delete more than was meant.
        {{"delete", "-y", "--host="}, "--host: empty"},
        {{"delete", "--grep=", "-y"}, "--grep: empty"},
        {{"delete", "--all", "-y", "extra"}, "extra"},
    };
    for (const auto &test : kCases) {
        SCOPED_TRACE(test.named);
        const ProgramResult result = OnSample(test.arguments);
        EXPECT_EQ(result.status, 2);
        EXPECT_NE(OnlyLine(result).find(test.named), std::string::npos) << result.err;
    }
    EXPECT_EQ(OnSample({"count"}).out, "10\n");
    EXPECT_EQ(RunTool(Arguments{"dance"}).status, 2);
    EXPECT_EQ(RunTool(Arguments{"search", "--help"}).status, 0);
}

TEST_F(Program, TellsInOneLineWhyADatabaseCannotBeRead) {
    InsertSampleLogs(db_, 2000);
    const std::string text = root_.File("text"), empty = root_.File("empty"), copy = root_.File("cut");
    WriteFile(text, "this is a long text that is certainly not a database");
    WriteFile(empty, "");
    RunSql(db_, "VACUUM INTO '" + copy + "'");
    std::filesystem::resize_file(copy, 8192);
    const std::string other = root_.File("other\x1b.db");
    RunSql(other, "CREATE TABLE x(y)");
    const struct {
        std::string path;
        std::string reason;
    } kCases[] = {
        {root_.File("missing"), "no such file"},
        {root_.Path(), "folder"},
        {text, "not an SQLite database"},
        {empty, "empty"},
        {copy, "cut short"},
        {other, "no usable table 'logs'"},
    };
    for (const auto &test : kCases) {
        SCOPED_TRACE(test.path);
        const Arguments commands[] = {
            {"search"}, {"count"}, {"values", "host"}, {"delete", "--all", "--yes"}, {"search", "-f"}};
        for (const Arguments &command : commands) {
            const ProgramResult result = On(test.path, command);
            EXPECT_EQ(result.status, 3) << command[0];
            const std::string line = OnlyLine(result);
            EXPECT_NE(line.find(test.reason), std::string::npos) << line;
            EXPECT_NE(line.find(test.path.substr(0, root_.Path().size())), std::string::npos) << line;
            EXPECT_EQ(line.find('\x1b'), std::string::npos);
        }
    }
    EXPECT_FALSE(std::filesystem::exists(root_.File("missing")));
}

TEST_F(Program, DeletesOnlyWhatWasConfirmed) {
    InsertSampleLogs(db_, 25000);
    const ProgramResult dry = OnSample({"delete", "-p", "debug..debug", "--dry-run"});
    EXPECT_EQ(dry.status, 0);
    EXPECT_EQ(dry.out, "would delete 3125 matching logs from " + db_ + "\n");
    EXPECT_EQ(OnSample({"delete", "-p", "debug..debug"}).status, 2);
    EXPECT_EQ(OnSample({"count"}).out, "25000\n");

    EXPECT_EQ(OnSample({"delete", "-p", "debug..debug", "--yes"}).out,
              "deleted 3125 matching logs from " + db_ + "\n");
    EXPECT_EQ(QueryText(db_, "SELECT count(*) || ' ' || sum(llevel = 'debug') FROM logs"), "21875 0");
    EXPECT_EQ(OnSample({"delete", "-p", "debug..debug", "--yes"}).status, 1);
    EXPECT_EQ(OnSample({"delete", "--all", "--yes"}).status, 0);
    EXPECT_EQ(OnSample({"count"}).status, 1);
}

TEST_F(Program, FollowsNewLogsUntilItsBoundsEndIt) {
    InsertSampleLogs(db_, 20);
    EXPECT_EQ(OnSample({"search", "-f", "-n", "2", "--idle", "0", "-o", "csv", "--fields", "id"}).out,
              "id\r\n19\r\n20\r\n");
    EXPECT_EQ(OnSample({"search", "-f", "-n", "0", "--idle", "0"}).status, 1);
    EXPECT_EQ(
        OnSample({"search", "-f", "--since", "@0", "--until", "@1577836801", "-o", "csv", "--fields", "id"})
            .out,
        "id\r\n1\r\n2\r\n");

    // It starts with the last log that is there; the others are written while it runs, then the file is
    // replaced.
    ProgramResult live;
    const std::string fifo = root_.File("fifo");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    std::thread runner([&] {
        live = RunTool(
            ProgramRun{{"search", "-f", "-n", "1", "--db", db_, "-o", "jsonl", "--fields", "id"}, {}, fifo});
    });
    FILE *stream = fopen(fifo.c_str(), "r");
    const auto nextLine = [stream] {
        char line[64] = "";
        return std::string(fgets(line, sizeof line, stream) != nullptr ? line : "");
    };
    EXPECT_EQ(nextLine(), "{\"id\":20}\n");
    InsertLogs(db_, {SampleLog(20)});
    EXPECT_EQ(nextLine(), "{\"id\":21}\n");
    CreateLogDatabase(root_.File("fresh"));
    InsertLogs(root_.File("fresh"), {SampleLog(0)});
    std::filesystem::rename(root_.File("fresh"), db_);
    EXPECT_EQ(nextLine(), "{\"id\":1}\n");
    fclose(stream); // there is no reader any more
    runner.join();
    EXPECT_EQ(live.status, 0);
    EXPECT_EQ(live.err, "");
}

TEST_F(Program, NoticesAFullDisk) {
    InsertSampleLogs(db_, 10);
    const ProgramResult full = RunTool({{"search", "--db", db_}, {}, "/dev/full"});
    EXPECT_EQ(full.status, 4);
    EXPECT_NE(OnlyLine(full).find("No space left"), std::string::npos);
}

} // namespace
} // namespace kelo::test
