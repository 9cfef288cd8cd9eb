// kelosyslog count: prints the number of records.

#include <ctime>

#include "base/errors.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "commands/index_upkeep.h"
#include "read/log_reader.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter = "Examples:\n"
                                "  kelosyslog count -p err --since today\n"
                                "  kelosyslog count -H nas1 -g '/refused|denied/'\n"
                                "  kelosyslog count --estimate\n\n"
                                "Exit status: 0 some, 1 none, 2 usage, 3 database, 4 output.";

struct Options {
    LogTableOptions table;
    LogFilter filter;
    bool inUtc = false;
    bool isEstimate = false;
};

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.inUtc);
    if (options.isEstimate && !IsEmpty(options.filter))
        throw UsageError("--estimate: is about the whole table and goes with no option that selects logs");
    const LogTable table = ResolveLogTable(options.table, root);
    const LogReader reader(table, MakeConditions(options.filter, table, std::time(nullptr)));
    const uint64_t count = options.isEstimate ? reader.IdFromNewest(0) : reader.Count();
    Output output(false);
    output.Write(std::to_string(count) + "\n");
    output.Finish();
    if (!options.filter.keywords.empty())
        ExtendIndexLater(table);
    return count > 0 ? kExitFound : kExitNothing;
}

} // namespace

void AddCount(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "count", "Print the number of logs",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    AddFilterOptions(command, options->filter);
    command.AddFlag("--estimate", options->isEstimate,
                    "The largest id instead: instant however large the table is, but deleted logs count too");
    AddUtcOption(command, options->inUtc);
    AddTableOptions(command, options->table);
}

} // namespace kelo::tool
