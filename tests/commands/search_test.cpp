// Search, count, values and delete on the working database.

#include "support/program_test.h"

namespace kelo::test {
namespace {

class Search : public ProgramTest {
protected:
    Search() { CreateLogDatabase(logs_); }
};

TEST_F(Search, PrintsTheNewestLogsOldestFirstAndTellsMatchFromNoMatch) {
    InsertSampleLogs(logs_, 100);
    RunSql(logs_, "DELETE FROM logs WHERE id BETWEEN 96 AND 98");
    Expect("search -n 3 -o csv --no-header --fields id,time", 0,
           "95,2020-01-01T00:01:34+00:00\r\n99,2020-01-01T00:01:38+00:00\r\n"
           "100,2020-01-01T00:01:39+00:00\r\n");
    Expect("search -r -n 2 --offset 1 -o csv --fields id", 0, "id\r\n99\r\n95\r\n");
    Expect("search -H nowhere", 1, "");
    Expect("search -n1 --db $PWD/var/log/kelolog/logs.db -o csv --no-header --fields host", 0, "host49\r\n");
    EXPECT_EQ(RunIn(root_.Path(), "TZ=IST-5:30 kelosyslog --root ./ search -n1 -o short").out.substr(0, 15),
              "Jan 01 05:31:39");
    Expect("count -H delete", 1);
    Expect("count", 0, "97\n");
    Expect("count --estimate", 0, "100\n");
    Expect("count -g '*'", 0, "97\n");
    Expect("count -g '/nothing like this/'", 1);
    Expect("values fac -n 2 --offset 1 -o json", 0, "[\n\"daemon\",\n\"kern\"\n]\n");
    EXPECT_THAT(Run("search >/dev/full").err, HasSubstr("No space left"));
    Expect("search >/dev/full", 4);
    Expect("search --help", 0);
}

TEST_F(Search, DeletesOnlyWhatWasConfirmed) {
    InsertSampleLogs(logs_, 25000);
    const std::string debug = " 3125 matching logs from " + logs_ + "\n";
    Expect("delete -p debug..debug --dry-run", 0, "would delete" + debug);
    Expect("delete -p debug..debug", 2);
    Expect("count", 0, "25000\n");
    Expect("delete -p debug..debug --yes", 0, "deleted" + debug);
    EXPECT_EQ(RunSql(logs_, "SELECT count(*) || ' ' || sum(llevel = 'debug') FROM logs"), "21875 0");
    Expect("delete -p debug..debug --yes", 1);
    Expect("delete --all --yes", 0);
    Expect("count", 1);
}

// It starts with the last log that is there; the others are written while it runs, then the file is replaced.
TEST_F(Search, FollowsNewLogsUntilItsBoundsEndIt) {
    InsertSampleLogs(logs_, 20);
    const std::string follow = "search -f -o csv --fields id ";
    Expect(follow + "-n 2 --idle 0", 0, "id\r\n19\r\n20\r\n");
    Expect(follow + "-n 0 --idle 0", 1);
    Expect(follow + "--since @0 --until @1577836801", 0, "id\r\n1\r\n2\r\n");

    const std::string command = kProgram + std::string("search -f -n 1 -o jsonl --fields id 2>err");
    FILE *stream = popen(InFolder(root_.Path(), command).c_str(), "r");
    const auto nextLine = [stream] {
        char line[64] = "";
        return std::string(fgets(line, sizeof line, stream) != nullptr ? line : "");
    };
    EXPECT_EQ(nextLine(), "{\"id\":20}\n");
    InsertLogs(logs_, {SampleLog(20)});
    EXPECT_EQ(nextLine(), "{\"id\":21}\n");
    CreateLogDatabase(root_.File("fresh"));
    InsertLogs(root_.File("fresh"), {SampleLog(0)});
    fs::rename(root_.File("fresh"), logs_);
    EXPECT_EQ(nextLine(), "{\"id\":1}\n");
    EXPECT_EQ(pclose(stream), 0) << "nobody reads any more";
    EXPECT_EQ(ReadFile(root_.File("err")), "");
}

} // namespace
} // namespace kelo::test
