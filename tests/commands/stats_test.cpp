// The statistics of the program: figures by interval, and their tables and bars.

#include "base/errors.h"
#include "print/statistics_table.h"
#include "read/eps_series.h"
#include "support/program_run.h"
#include "support/test.h"

namespace kelo::test {
namespace {

using namespace kelo::tool;

class Stats : public testing::Test {
protected:
    Stats() {
        CreateLogDatabase(db_, "accinfo.sql");
        // 2020-01-01 00:00:00 UTC, a minute's end, the next minute, two days later
        RunSql(db_, "INSERT INTO eps(stamp, device, eps) VALUES(1577836800, 'a', 3), (1577836800, 'b', 1),"
                    "(1577836859, 'a', 2), (1577836860, 'O''Brien', 6), (1578009600, 'b', 30);"
                    "INSERT INTO histogram(device, count) VALUES('a', 25), ('b', 31), ('O''Brien', 25), "
                    "('\x1b', 19)");
    }
    ProgramResult Run(std::vector<std::string> arguments) const {
        arguments.insert(arguments.begin(), "stats");
        arguments.insert(arguments.end(), {"--db", db_});
        return RunTool({arguments, {"TZ=IST-5:30", "COLUMNS=46", "LC_ALL=C.UTF-8"}});
    }

    TempRoot root_;
    const std::string db_ = root_.File("acc");
};

TEST_F(Stats, PrintsTheSameFiguresInEveryForm) {
    const struct {
        std::vector<std::string> arguments;
        std::string out;
    } cases[] = {
        {{"devices"},
         "DEVICE   COUNT  PERCENT\nb           31    31.00\nO'Brien     25    25.00\n"
         "a           25    25.00\n\\x1b        19    19.00\n"},
        {{"devices", "--top", "1", "-o", "json"},
         "[\n{\"device\":\"b\",\"count\":31,\"percent\":31.00}\n]\n"},
        {{"device", "O'Brien", "-o", "jsonl"}, "{\"device\":\"O'Brien\",\"count\":25}\n"},
        {{"total", "-o", "csv"}, "count,devices\r\n100,4\r\n"},
        {{"eps", "--since", "@0", "--utc"},
         "TIME                 COUNT   EPS  PEAK\n2020-01-01 00:00:00      6  0.10     4\n"
         "2020-01-01 00:01:00      6  0.10     6\n2020-01-03 00:00:00     30  0.50    30\n"},
        {{"eps", "--since", "@0", "--by", "hour", "--device", "a", "--no-header"},
         "2020-01-01 05:00:00  5  0.00  3\n"},
        {{"eps", "--by", "second", "--per-device", "--until", "@1577836859", "-o", "csv", "--no-header"},
         "2020-01-01T05:30:00+05:30,a,3,3.00\r\n2020-01-01T05:30:00+05:30,b,1,1.00\r\n"
         "2020-01-01T05:30:59+05:30,a,2,2.00\r\n"},
        {{"eps", "--since", "@0", "--utc", "--plot", "--no-header"},
         "2020-01-01 00:00:00   6  0.10   4  ██▎\n2020-01-01 00:01:00   6  0.10   6  ██▎\n"
         "...                   0  0.00   0\n2020-01-03 00:00:00  30  0.50  30  ███████████\n"},
    };
    for (const auto &c : cases) {
        const ProgramResult result = Run(c.arguments);
        EXPECT_EQ(result.out, c.out) << result.err;
        EXPECT_EQ(result.status, 0);
    }
    EXPECT_EQ(Run({"device", "nobody"}).status, 1);
    EXPECT_EQ(Run({"eps"}).status, 1);
}

TEST_F(Stats, RefusesWhatItCannotDo) {
    const struct {
        std::vector<std::string> arguments;
        std::string named;
    } cases[] = {
        {{"rate"}, "'rate'"},
        {{"eps", "--top", "3"}, "--top"},
        {{"devices", "--top", "0"}, "--top: '0'"},
        {{"eps", "--by", "day"}, "--by: 'day'"},
        {{"eps", "--plot", "-o", "json"}, "--plot"},
    };
    for (const auto &c : cases) {
        const ProgramResult result = Run(c.arguments);
        EXPECT_EQ(result.status, 2) << result.err;
        EXPECT_NE(result.err.find(c.named), std::string::npos) << result.err;
    }
    RunSql(db_, "DROP TABLE eps; DROP TABLE histogram");
    for (const char *what : {"eps", "total"}) {
        const ProgramResult result = Run({what});
        EXPECT_EQ(result.status, 3);
        EXPECT_NE(result.err.find(db_), std::string::npos) << result.err;
    }
}

} // namespace
} // namespace kelo::test
