// kelosyslog count: limits, and counts by time and by column.

#include "support/program_test.h"

namespace kelo::test {
namespace {

class Count : public ProgramTest {
protected:
    Count() { CreateLogDatabase(logs_); }
};

TEST_F(Count, StopsAtALimitAlsoWhereIdsAreFarApart) {
    RunSql(logs_, "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 300) "
                  "INSERT INTO logs(id, host) SELECT i * 30000000000000000, 'h' || (i % 3) FROM n");
    Expect("count -o json", 0, "{\"count\":300}\n");
    Expect("count -o json -H nobody", 1, "{\"count\":0}\n");
    Expect("count --limit 299", 0, "more than 299\n");
    Expect("count --limit 300", 0, "300\n");
    Expect("count --limit 99 -H h1 -o json", 0, "{\"count\":99,\"more\":true}\n");
    Expect("count --limit 9223372036854775806 -H h1 -o json", 0, "{\"count\":100,\"more\":false}\n");
    Expect("count --limit 0 -H h1", 0, "more than 0\n");
    Expect("count --limit 0 -H nobody", 1, "0\n");
}

// Weeks begin on Monday and days at midnight of the zone; a bucket holds its first second and not its last.
TEST_F(Count, SplitsByTimeWithEmptyBucketsAndWhatHasNoTime) {
    RunSql(
        logs_,
        "INSERT INTO logs(utcsec, llevel, host) VALUES (1577836799, 'err', 'a'), (1577836800, 'info', 'a'),"
        "(1577836859, 'err', 'b'), (1577836920, 'nonsense', 'a'), (NULL, 'err', 'a'), ('soon', NULL, 'a'),"
        "(9223372036854775807, 'err', 'a')");
    Expect(
        "count --by 1min --until @1577840000 --since @1577836799 -o json",
        0, "{\"span\":60,\"first\":1577836740,\"count\":4,\"untimed\":0,\"buckets\":[\n" + [] {
            std::string rest = "{\"time\":1577836740,\"count\":1,\"severities\":{\"err\":1}},\n"
                               "{\"time\":1577836800,\"count\":2,\"severities\":{\"err\":1,\"info\":1}},\n"
                               "{\"time\":1577836860,\"count\":0,\"severities\":{}},\n"
                               "{\"time\":1577836920,\"count\":1,\"severities\":{\"unknown\":1}}";
            for (int64_t time = 1577836980; time <= 1577839980; time += 60)
                rest += ",\n{\"time\":" + std::to_string(time) + ",\"count\":0,\"severities\":{}}";
            return rest;
        }() + "\n]}\n");
    RunSql(logs_, "DELETE FROM logs WHERE utcsec = 9223372036854775807");
    RunSql(logs_, "INSERT INTO logs(utcsec, llevel) VALUES (1577836860, 'err')");
    const std::string head = "{\"span\":";
    const std::pair<std::string, std::string> cases[] = {
        {"--buckets 4", head + "60,\"first\":1577836740,\"count\":7,\"untimed\":2,"},
        {"--buckets 3", head + "300,\"first\":1577836500,\"count\":7,\"untimed\":2,"},
        {"--buckets 1", head + "604800,\"first\":1577664000,\"count\":7,\"untimed\":2,"},
        {"--buckets 1 -H a", head + "604800,\"first\":1577664000,\"count\":5,\"untimed\":2,"},
        {"--by 1w -H b", head + "604800,\"first\":1577664000,\"count\":1,\"untimed\":0,"},
        {"--buckets 1 -H nobody", head + "1,\"first\":null,\"count\":0,\"untimed\":0,\"buckets\":[\n]}\n"},
        {"--buckets 24 -H nobody --since @1577836800 --until @1577923199",
         head + "3600,\"first\":1577836800,\"count\":0,\"untimed\":0,\"buckets\":[\n"
                "{\"time\":1577836800,\"count\":0,\"severities\":{}},"},
    };
    for (const auto &[options, begin] : cases)
        EXPECT_THAT(Run("count -o json " + options).out, testing::StartsWith(begin)) << options;
    EXPECT_THAT(RunIn(root_.Path(), "TZ=IST-5:30 kelosyslog --root . count --by 1d -H b").out,
                HasSubstr("2020-01-01 00:00:00      1    1\n"));
    Expect("count --by 1d -H b", 0, "TIME                 COUNT  ERR\n2020-01-01 00:00:00      1    1\n");
    Expect("count --by 1s --since @0 --until @200000", 2);
    Expect("count --by 0s", 2);
}

TEST_F(Count, SplitsByColumnTheMostFrequentFirst) {
    RunSql(
        logs_,
        "INSERT INTO logs(host, prog, fac, llevel) VALUES ('b\"', 'p', 'kern', 'err'), ('b\"', 'p', 'kern', "
        "'info'), ('a', 'p', NULL, 'err');"
        "CREATE TABLE transfer_log(id INTEGER PRIMARY KEY, host, prog);"
        "INSERT INTO transfer_log(host) VALUES ('h')");
    Expect("count --by host -o json", 0,
           "{\"by\":\"host\",\"count\":3,\"buckets\":[\n"
           "{\"value\":\"b\\\"\",\"count\":2,\"severities\":{\"err\":1,\"info\":1}},\n"
           "{\"value\":\"a\",\"count\":1,\"severities\":{\"err\":1}}\n]}\n");
    Expect("count --by severity -o csv", 0, "value,count\r\nerr,2\r\ninfo,1\r\n");
    Expect("count --by facility -H a -o json", 0,
           "{\"by\":\"facility\",\"count\":1,\"buckets\":[\n"
           "{\"value\":\"\",\"count\":1,\"severities\":{\"err\":1}}\n]}\n");
    Expect("count --by host --table transfer_log", 0, "VALUE  COUNT\nh          1\n");
    Expect("count --by severity --table transfer_log", 2);
    Expect("count --by 1h --table transfer_log", 2);
    Expect("count --by host --limit 5", 2);
    Expect("count --by message", 2);
}

TEST_F(Count, CountsTheValuesOfAnyColumnAndFilter) {
    RunSql(
        logs_,
        "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 12000) "
        "INSERT INTO logs(host, prog, llevel, msg, utcsec) SELECT CASE i % 4 WHEN 0 THEN NULL WHEN 1 THEN "
        "'b' "
        "ELSE 'a' END, 'p' || (i % 3), 'info', CASE WHEN i > 11000 THEN 'rare' ELSE 'often' END, i FROM n;"
        "INSERT INTO logs(host, msg, utcsec) VALUES ('', 'last', NULL), (CAST(X'ff' AS TEXT), 'last', NULL)");
    const std::pair<std::string, std::string> cases[] = {
        {"host --counts", "VALUE  COUNT\na       6000\n        3001\nb       3000\n\\xff       1\n"},
        {"host --counts -n 1 --offset 1 -o jsonl", "{\"value\":\"\",\"count\":3001}\n"},
        {"host --counts -g rare -o csv", "value,count\r\na,500\r\n,250\r\nb,250\r\n"},
        {"host --counts -g often -n 1 -o csv --no-header", "a,5500\r\n"},
        {"host --counts --since @11999 -o csv --no-header", ",1\r\na,1\r\n"},
        {"host -g last -o jsonl", "\"\"\n\"\xef\xbf\xbd\"\n"},
        {"host --counts --offset 3 -o jsonl",
         "{\"value\":\"\xef\xbf\xbd\",\"value_base64\":\"/w==\",\"count\":1}\n"},
        {"prog -t p1,p2", "p1\np2\n"},
        {"msg --counts -o csv --no-header", "often,11000\r\nrare,1000\r\nlast,2\r\n"},
        {"utcsec -H b --since @11990 -o json", "[\n\"11993\",\n\"11997\"\n]\n"},
        {"utcsec --counts -n 2 -o csv --no-header", ",2\r\n1,1\r\n"},
    };
    for (const auto &[options, out] : cases)
        Expect("values " + options, 0, out);
    Expect("values host --counts -H nobody", 1, "");
    Expect(
        "count --by host -g rare -o csv", 0,
        "value,count,emerg,alert,crit,err,warning,notice,info,debug,unknown\r\na,500,0,0,0,0,0,0,500,0,0\r\n"
        ",250,0,0,0,0,0,0,250,0,0\r\nb,250,0,0,0,0,0,0,250,0,0\r\n");
}

} // namespace
} // namespace kelo::test
