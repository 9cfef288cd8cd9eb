// The statistics of the program: figures by interval, and their tables and bars.

#include "support/program_test.h"

namespace kelo::test {
namespace {

using Stats = ProgramTest;

TEST_F(Stats, PrintsTheSameFiguresInEveryForm) {
    CreateLogDatabase(accounting_, "accinfo.sql");
    // 2020-01-01 00:00:00 UTC, a minute's end, the next minute, two days later
    RunSql(accounting_,
           "INSERT INTO eps(stamp, device, eps) VALUES(1577836800, 'a', 3), (1577836800, 'b', 1),"
           "(1577836859, 'a', 2), (1577836860, 'O''Brien', 6), (1578009600, 'b', 30);"
           "INSERT INTO histogram(device, count) VALUES('a', 25), ('b', 31), ('O''Brien', 25), "
           "('\x1b', 19)");
    const std::pair<const char *, std::string> cases[] = {
        {"devices", "DEVICE   COUNT  PERCENT\nb           31    31.00\nO'Brien     25    25.00\n"
                    "a           25    25.00\n\\x1b        19    19.00\n"},
        {"devices --top 1 -o json", "[\n{\"device\":\"b\",\"count\":31,\"percent\":31.00}\n]\n"},
        {"device \"O'Brien\" -o jsonl", "{\"device\":\"O'Brien\",\"count\":25}\n"},
        {"total -o csv", "count,devices\r\n100,4\r\n"},
        {"eps --since @0 --utc",
         "TIME                 COUNT   EPS  PEAK\n2020-01-01 00:00:00      6  0.10     4\n"
         "2020-01-01 00:01:00      6  0.10     6\n2020-01-03 00:00:00     30  0.50    30\n"},
        {"eps --since @0 --by hour --device a --no-header", "2020-01-01 05:00:00  5  0.00  3\n"},
        {"eps --by second --per-device --until @1577836859 -o csv --no-header",
         "2020-01-01T05:30:00+05:30,a,3,3.00,1577836800\r\n2020-01-01T05:30:00+05:30,b,1,1.00,1577836800\r\n"
         "2020-01-01T05:30:59+05:30,a,2,2.00,1577836859\r\n"},
        {"eps --empty --since @1577836780 --until @1577836920 --utc --no-header",
         "2019-12-31 23:59:00  0  0.00  0\n2020-01-01 00:00:00  6  0.10  4\n"
         "2020-01-01 00:01:00  6  0.10  6\n2020-01-01 00:02:00  0  0.00  0\n"},
        {"eps --empty --by hour --until @1577844000 -o jsonl --utc",
         "{\"time\":\"2020-01-01T00:00:00+00:00\",\"count\":12,\"eps\":0.00,\"peak\":6,\"utcsec\":1577836800}"
         "\n"
         "{\"time\":\"2020-01-01T01:00:00+00:00\",\"count\":0,\"eps\":0.00,\"peak\":0,\"utcsec\":1577840400}"
         "\n"
         "{\"time\":\"2020-01-01T02:00:00+00:00\",\"count\":0,\"eps\":0.00,\"peak\":0,\"utcsec\":1577844000}"
         "\n"},
        {"eps --since @0 --utc --plot --no-header",
         "2020-01-01 00:00:00   6  0.10   4  ██▎\n2020-01-01 00:01:00   6  0.10   6  ██▎\n"
         "...                   0  0.00   0\n2020-01-03 00:00:00  30  0.50  30  ███████████\n"},
    };
    for (const auto &[words, out] : cases) {
        const ProgramResult result =
            RunIn(root_.Path(),
                  std::string("TZ=IST-5:30 COLUMNS=46 LC_ALL=C.UTF-8 kelosyslog --root . stats ") + words);
        EXPECT_EQ(result.out, out) << result.err;
        EXPECT_EQ(result.status, 0);
    }
    Expect("stats device nobody", 1);
    Expect("stats eps", 1);
    Expect("stats eps --empty --since @0", 2);
}

} // namespace
} // namespace kelo::test
