// kelosyslog count: prints the number of records.

#include <ctime>
#include <limits>
#include <optional>

#include "base/errors.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "commands/count_by.h"
#include "commands/index_upkeep.h"
#include "keloplatform/cluster.h"
#include "read/log_reader.h"
#include "read/log_tally.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter = "Examples:\n"
                                "  kelosyslog count -p err --since today\n"
                                "  kelosyslog count -H nas1 -g '/refused|denied/'\n"
                                "  kelosyslog count --limit 100000 -p warning\n"
                                "  kelosyslog count --by 1h --since today\n"
                                "  kelosyslog count --by host -p err --since -1d\n"
                                "  kelosyslog count --buckets 60 -g refused -o json\n"
                                "  kelosyslog count --estimate\n\n"
                                "Exit status: 0 some, 1 none, 2 usage, 3 database, 4 output.";

constexpr uint64_t kHighestLimit = std::numeric_limits<int64_t>::max() - 1;

struct Options {
    LogTableOptions table;
    LogFilter filter;
    CountByOptions by;
    std::string limit;
    std::string format = "text";
    bool inUtc = false;
    bool isEstimate = false;

    bool IsSplit() const { return !by.by.empty() || !by.buckets.empty(); }
};

void RequireSense(const Options &options) {
    if (options.isEstimate && !IsEmpty(options.filter))
        throw UsageError("--estimate: is about the whole table and goes with no option that selects logs");
    if (options.isEstimate && (options.IsSplit() || !options.limit.empty()))
        throw UsageError("--estimate: goes neither with --by, --buckets nor --limit");
    if (options.IsSplit() && !options.limit.empty())
        throw UsageError("--limit: goes neither with --by nor with --buckets");
}

// Counts up to `limit`, if there is one.
std::string Answer(uint64_t count, std::optional<uint64_t> limit, OutputFormat format) {
    const bool hasMore = limit && count > *limit;
    const std::string number = std::to_string(hasMore ? *limit : count);
    if (format == OutputFormat::Text)
        return (hasMore ? "more than " : "") + number + "\n";
    return "{\"count\":" + number + (limit ? std::string(",\"more\":") + (hasMore ? "true" : "false") : "") +
           "}\n";
}

int PrintCount(const LogTable &table, const Conditions &conditions, const Options &options) {
    const OutputFormat format = ParseKeyValuesFormat(options.format);
    std::optional<uint64_t> limit;
    if (!options.limit.empty())
        limit = ParseNumber("--limit", options.limit, 0, kHighestLimit);
    const LogReader reader(table, conditions);
    // A cluster counts at once, and its ids are times.
    const bool countsAll = (!options.isEstimate && !limit) || KELODBIsCluster(table.path.c_str()) != 0;
    const uint64_t count = countsAll            ? reader.Count()
                           : options.isEstimate ? reader.IdFromNewest(0)
                                                : CountUpTo(table, conditions, *limit);
    Output output(false);
    output.Write(Answer(count, limit, format));
    output.Finish();
    return count > 0 ? kExitFound : kExitNothing;
}

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.inUtc);
    RequireSense(options);
    const OutputFormat format = ParseOutputFormat(options.format);
    if (format == OutputFormat::Short)
        throw UsageError("--output: counts have no form 'short'; forms are text, json, and with --by and "
                         "--buckets also jsonl, csv, spreadsheet");
    const int64_t now = std::time(nullptr);
    const LogTable table = ResolveLogTable(options.table, root);
    const Conditions conditions = MakeConditions(options.filter, table, now);
    const int status = options.IsSplit() ? CountBy(table, conditions, options.filter, now, options.by, format)
                                         : PrintCount(table, conditions, options);
    if (!options.filter.keywords.empty())
        ExtendIndexLater(table);
    return status;
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
    const std::string how = "How to count";
    OfferWords(
        command.AddText("--by", options->by.by, "WHAT",
                        "Split by time (60s, 15min, 1h, 1d; spans begin as on a clock) or by severity, host, "
                        "program or facility, and by severity within each"),
        CountedColumnNames())
        .Group(how);
    command
        .AddText(
            "--buckets", options->by.buckets, "N",
            "Split by time, into at most N equal spans between --since and --until, or the oldest and newest "
            "matching log")
        .Group(how);
    command.AddText("--limit", options->limit, "N", "Stop counting when there are more than N").Group(how);
    OfferWords(
        command.AddText("-o,--output", options->format, "FORMAT",
                        "text (default) or json; with --by and --buckets also jsonl, csv, spreadsheet"),
        {"text", "json", "jsonl", "csv", "spreadsheet"})
        .Group(how);
    AddUtcOption(command, options->inUtc);
    AddTableOptions(command, options->table);
    AddPartialOption(command, options->table);
}

} // namespace kelo::tool
