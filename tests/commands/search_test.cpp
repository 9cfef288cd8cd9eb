// Search, count, values and delete on the working database.

#include "support/program_test.h"

namespace kelo::test {
namespace {

class Search : public ProgramTest {
protected:
    Search() { CreateLogDatabase(logs_); }

    // "1 2 " for a search that prints these.
    std::string Ids(const std::string &options) const {
        std::string ids = Run("search -o csv --no-header --fields id " + options).out;
        for (size_t at = 0; (at = ids.find("\r\n", at)) != std::string::npos;)
            ids.replace(at, 2, " ");
        return ids;
    }
};

TEST_F(Search, PrintsTheNewestLogsOldestFirstAndTellsMatchFromNoMatch) {
    InsertSampleLogs(logs_, 100);
    RunSql(logs_, "DELETE FROM logs WHERE id BETWEEN 96 AND 98");
    Expect("search -n 3 -o csv --no-header --fields id,time", 0,
           "95,2020-01-01T00:01:34+00:00\r\n99,2020-01-01T00:01:38+00:00\r\n"
           "100,2020-01-01T00:01:39+00:00\r\n");
    Expect("search -r -n 2 --offset 1 -o csv --fields id", 0, "id\r\n99\r\n95\r\n");
    Expect("search -H nowhere", 1, "");
    Expect("search -n1 --db $PWD/var/log/kelosyslog/logs.db -o csv --no-header --fields host", 0,
           "host49\r\n");
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

TEST_F(Search, SelectsByEveryOption) {
    RunSql(logs_, R"(INSERT INTO logs(id, host, prog, fac, llevel, utcsec, msg) VALUES
        (1, 'host01', 'p0', 'local0', 'emerg', 1577836800, 'a FAILED b'),
        (2, 'host02', 'p1', 'kern', 'alert', 1577836801, 'failed'),
        (3, 'host03', 'p0', 'local7', 'crit', 1577836802, 'x y'), (4, 'host12', 'p1', 'local0', 'err', 1577836803, ''),
        (5, 'host1', 'p2', 'user', 'warning', 1577836804, 'y x'), (6, 'na[s]*''', 'p2', 'auth', 'notice', 1577836805, '*'),
        (7, 'nas', 'p2', 'local0', 'info', 1577836806, 'disk'), (8, 'b', 'p2', 'local0', 'debug', 1577836807, 'disk'),
        (9, NULL, NULL, NULL, NULL, NULL, NULL), (10, 'b', 'p3', 'local0', '7', 1577836809, 'x');
        CREATE TABLE general_log(id INTEGER PRIMARY KEY, host, llevel, prog, ldate, ltime, luser, msg);
        INSERT INTO general_log(id, llevel, ldate, ltime, msg) VALUES (1, 'err', '2019/12/31', '23:59:59', 'a'),
        (2, 'info', '2020/01/01', '00:00:00', 'b'), (3, 'err', '2020/01/01', '10:00:00', 'c'),
        (4, 'err', '2020/01/02', '00:00:00', 'd'))");
    std::string many = "-H b";
    for (int i = 0; i < 499; ++i)
        many += ",a";
    const std::pair<std::string, std::string> cases[] = {
        {"-H host01,host02 -H host03", "1 2 3 "},
        {"-H 'host1*,!host?2'", "5 "},
        {"-H \"!na[s]?'\"", "1 2 3 4 5 7 8 9 10 "},
        {many, "8 10 "},
        {"-t '!p0' -g '*'", "2 4 5 6 7 8 10 "},
        {"-p info..warning", "5 6 7 "},
        {"-p '!debug,!emerg..crit'", "4 5 6 7 9 10 "},
        {"-p 'warn,!alert'", "1 3 4 5 "},
        {"-p '!err' -H '!b'", "1 2 3 5 6 7 9 "}, // no value is none that is excluded
        {"--facility local0,23,!local7", "1 4 7 8 10 "},
        {"-g failed", "1 2 "},
        {"-g x -g '\"x y\"'", "3 "},
        {"--since @1577836802 --until @1577836804", "3 4 5 "},
        {"--table general_log --since 2020-01-01 --until 2020-01-02", "2 3 "},
        {"--table general_log --until '2020-01-02 00:00' -p err..err", "1 3 4 "},
    };
    for (const auto &[options, ids] : cases) {
        EXPECT_EQ(Ids(options), ids) << options.substr(0, 80);
        Expect("count " + options, 0, std::to_string(std::ranges::count(ids, ' ')) + "\n");
    }
}

TEST_F(Search, PagesByIdFromBothEnds) {
    InsertSampleLogs(logs_, 20);
    RunSql(logs_, "DELETE FROM logs WHERE id BETWEEN 8 AND 12;"
                  "INSERT INTO logs(id, utcsec) VALUES (9223372036854775807, 1577836900)");
    const std::string largest = "9223372036854775807";
    const std::pair<std::string, std::string> cases[] = {
        {"-n 3 --before-id 14", "6 7 13 "},
        {"-n 3 --before-id 14 -r", "13 7 6 "},
        {"-n 3 --after-id 6 --oldest", "7 13 14 "},
        {"-n 3 --after-id 6", "19 20 " + largest + " "},
        {"-n 3 --after-id 6 --oldest -r", "14 13 7 "},
        {"-n 2 --oldest --offset 6", "7 13 "},
        {"--after-id 6 --before-id 14", "7 13 "},
        {"--after-id 20", largest + " "},
        {"--after-id " + largest, ""},
        {"--before-id " + largest + " -n 1", "20 "},
        {"--before-id 1", ""},
        {"--before-id 14 -n 2 -H host03,host12 --oldest", "4 13 "},
        {"--follow --after-id 20 --idle 0", largest + " "},
        {"--follow --after-id 3 -n 2 --idle 0", "20 " + largest + " "},
    };
    for (const auto &[options, ids] : cases)
        EXPECT_EQ(Ids(options), ids) << options;
    Expect("search --before-id 9223372036854775808", 2);
    Expect("search --follow --before-id 5", 2);
}

TEST_F(Search, TakesNamesAsTheyAre) {
    RunSql(logs_,
           "INSERT INTO logs(host, prog) VALUES ('a,b', 'p*'), ('!c', 'p1'), ('a', 'it''s'), ('b', NULL)");
    const std::pair<std::string, std::string> cases[] = {
        {"--host-is a,b", "1 "},
        {"--host-is '!c' --host-is b", "2 4 "},
        {"--program-is 'p*'", "1 "},
        {"--program-is \"it's\" --host-is a", "3 "},
        {"--program-is-not 'p*' --program-is-not \"it's\"", "2 4 "},
        {"--host-is-not a,b -H 'a,b'", "3 4 "},
    };
    for (const auto &[options, ids] : cases)
        EXPECT_EQ(Ids(options), ids) << options;
    Expect("search --host-is ''", 2);
}

TEST_F(Search, CutsMessagesAtAWholeCharacter) {
    RunSql(
        logs_,
        "INSERT INTO logs(msg) VALUES ('ab\xc3\xa4z'), ('abc'), ('ab' || CAST(X'80808080808080' AS TEXT))");
    Expect("search --max-message 3 -o jsonl --fields id,msg", 0,
           "{\"id\":1,\"msg\":\"ab\",\"length\":5}\n{\"id\":2,\"msg\":\"abc\",\"length\":3}\n"
           "{\"id\":3,\"msg\":\"ab\xef\xbf\xbd\",\"msg_base64\":\"YWKA\",\"length\":9}\n");
    Expect("search --max-message 4 -o csv --no-header --fields msg -n 1 --oldest", 0, "ab\xc3\xa4\r\n");
    EXPECT_THAT(Run("search --max-message 1 -o short -n 1").out, HasSubstr(" : a\n"));
}

TEST_F(Search, PrintsHostileLogsWholeInFilesAndHarmlessOnATerminal) {
    const std::string japanese = "\xe6\x97\xa5\xe6\x9c\xac", prog = "\x1b]0;owned\x07", bad = "\xef\xbf\xbd";
    const std::string msg = "a\\b\r\nc\td \xff\xc3( \xed\xa0\x80 \xc2\x9b"
                            "31m \xe2\x80\xae " +
                            japanese;
    const std::string shown = R"(a\b\r\nc\td \xff\xc3( \xed\xa0\x80 \u009b31m \u202e )" + japanese + "\n";
    RunSql(logs_, "INSERT INTO logs(id, utcsec, prio, llevel, host, prog, msg) VALUES (9223372036854775807, "
                  "1577959872, 'err', 'err', "
                  "'h\"o,s''t', '" +
                      prog + "', '" + msg + "')");
    const std::string json =
        R"({"id":9223372036854775807,"time":"2020-01-02T10:11:12+00:00","prio":"err","host":"h\"o,s't",)"
        R"("prog":"\u001b]0;owned\u0007","msg":"a\\b\r\nc\td )" +
        bad + bad + "( " + bad + bad + bad + " \\u009b31m \\u202e " + japanese +
        R"(","msg_base64":"YVxiDQpjCWQg/8MoIO2ggCDCmzMxbSDigK4g5pel5pys"})";
    Expect("search -o json --fields id,time,prio,host,prog,msg", 0, "[\n" + json + "\n]\n");
    Expect("search -o jsonl --fields id,time,prio,host,prog,msg", 0, json + "\n");
    Expect("search -o json -H nobody", 1, "[\n]\n");
    Expect("search -o short", 0, "Jan 02 10:11:12 h\"o,s't \\x1b]0;owned\\x07: " + shown);
    Expect("search --fields prog,msg", 0, "PROG              MSG\n\\x1b]0;owned\\x07  " + shown);
    RunSql(logs_, "INSERT INTO logs(id) VALUES (1)");
    Expect("search -o csv --fields host,prog,msg,llevel,id", 0,
           "host,prog,msg,prio,id\r\n,,,debug,1\r\n\"h\"\"o,s't\"," + prog + ",\"" + msg +
               "\",err,9223372036854775807\r\n");
    Expect("search -o csv --no-header --fields msg -n 1 --offset 1", 0, "\"\"\r\n");
    EXPECT_THAT(RunIn(root_.Path(), "exec script -qec 'kelosyslog --root . search -o csv --no-header "
                                    "--fields prog -n 1 --no-pager' log")
                    .out,
                HasSubstr("\\x1b]0;owned\\x07\r"));
    RunIn(root_.Path(), "SUDO_UID=1 PAGER='touch ran' exec script -qec 'kelosyslog --root . search' log");
    EXPECT_FALSE(fs::exists(root_.File("ran"))) << "a rule of sudo for a search is none for other programs";
    RunSql(logs_, "DELETE FROM logs");
    std::string expected;
    int id = 0;
    for (const auto &[text, shown] : std::map<std::string, std::string>{{"=1+1", "'=1+1"},
                                                                        {"-5", "-5"},
                                                                        {"-5+A1", "'-5+A1"},
                                                                        {"@x,y", "\"'@x,y\""},
                                                                        {"\t=1", "'\t=1"},
                                                                        {"a=1", "a=1"},
                                                                        {"+", "'+"}}) {
        RunSql(logs_, "INSERT INTO logs(id, msg) VALUES (" + std::to_string(++id) + ", '" + text + "')");
        expected += shown + "\r\n";
    }
    Expect("search -o spreadsheet --no-header --fields msg", 0, expected);
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
