// kelosyslog search -n all -o csv and -o jsonl, from start to exit, against the sqlite3 shell's -csv and
// -json. Both write 13 columns: the shell those of the table, the program "time" in the place of "llevel".
//
//   bench_export [ROWS]      1,000,000 unless given

#include <cstdlib>
#include <string>

#include "real_text.h"
#include "support/measure.h"

using namespace kelo::bench;

namespace {

constexpr int kRounds = 5;

Variant Command(const std::string &name, const std::string &command) {
    return {name, [command] {
                return Time([&] {
                    if (std::system((command + " >/dev/null").c_str()) != 0)
                        Fail("failed: " + command);
                });
            }};
}

} // namespace

int main(int argc, char **argv) {
    const int rows = argc > 1 ? std::atoi(argv[1]) : 1'000'000;
    const std::string database = "'" + RealTextDatabase(rows) + "'";
    const std::string ours = KELO_PROGRAM " search -n all --db " + database + " -o ";
    const std::string shell = "sqlite3 " + database + " 'SELECT * FROM logs' ";
    PrintHeading("Exporting " + std::to_string(rows) + " rows, from start to exit", "ms");
    const auto times =
        MedianTimes({Command("csv", ours + "csv"), Command("shell, csv", shell + "-csv -header"),
                     Command("jsonl", ours + "jsonl"), Command("shell, json", shell + "-json")},
                    kRounds);
    const bool isCsvKept = PrintRatio("search -n all -o csv", times[0], "sqlite3 -csv", times[1], 1);
    return PrintRatio("search -n all -o jsonl", times[2], "sqlite3 -json", times[3], 1) && isCsvKept ? 0 : 1;
}
