// kelosyslog values: prints the distinct values of a column.

#include <algorithm>
#include <ctime>

#include "base/errors.h"
#include "base/json.h"
#include "base/text_encoding.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "kelosyslog/dbutil.h"
#include "print/statistics_table.h"
#include "read/log_tally.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter = "Examples:\n"
                                "  kelosyslog values host\n"
                                "  kelosyslog values prog -o json\n"
                                "  kelosyslog values ldate -n 10 --offset 20\n"
                                "  kelosyslog values host --counts -n 10 -p err --since today\n\n"
                                "Exit status: 0 found, 1 no log matched, 2 usage, 3 database, 4 output.";

constexpr uint64_t kMaxRows = 4294967295; // what the library passes on

struct Options {
    LogTableOptions table;
    LogFilter filter;
    std::string attribute;
    std::string format = "text";
    std::string lines;
    std::string offset;
    bool hasCounts = false;
    bool noHeader = false;
    bool inUtc = false;
};

// The columns of table "logs", which is the only one used.
std::vector<std::string> AttributeNames() {
    std::vector<std::string> names;
    for (int32_t i = SYSLOG_ATTRI_ID; i <= SYSLOG_ATTRI_MSG; ++i)
        names.emplace_back(LogAttriStrGet(static_cast<_SYSLOG_DB_ATTRI_tag>(i)));
    return names;
}

void RequireAttribute(const std::string &name) {
    std::string names;
    for (const std::string &attribute : AttributeNames()) {
        if (name == attribute)
            return;
        names += (names.empty() ? "" : ", ") + attribute;
    }
    throw UsageError("values: '" + name + "' is no attribute; attributes are " + names);
}

_SYSLOG_SQL_LIMIT_tag ParseLimit(const Options &options) {
    _SYSLOG_SQL_LIMIT_tag limit;
    if (!options.lines.empty())
        limit.limit = ParseNumber("--lines", options.lines, 1, kMaxRows);
    if (!options.offset.empty())
        limit.offset = ParseNumber("--offset", options.offset, 0, kMaxRows);
    return limit;
}

// All values of the table, as the library knows them.
std::list<std::string> ReadValues(const Options &options, const LogTable &table) {
    _SYSLOG_SQL_LIMIT_tag limit = ParseLimit(options);
    const bool isLimited = !options.lines.empty() || !options.offset.empty();
    std::list<std::string> values;
    if (SyslogDBAttriValueGet(table.path, options.attribute, isLimited ? &limit : nullptr, values) != 0)
        throw DatabaseError(DescribeDatabaseProblem(table));
    return values;
}

// Those of the selected records.
std::vector<ValueCount> ReadCounts(const Options &options, const LogTable &table) {
    const _SYSLOG_SQL_LIMIT_tag limit = ParseLimit(options);
    Conditions conditions = MakeConditions(options.filter, table, std::time(nullptr));
    if (!options.filter.keywords.empty())
        conditions = NarrowToFew(table, conditions);
    return CountValues(table, conditions, options.attribute, {options.hasCounts, limit.limit, limit.offset});
}

void PrintCounts(const std::vector<ValueCount> &values, bool hasHeader, OutputFormat format) {
    StatisticsTable table({{"value", false}, {"count", true}});
    for (const ValueCount &value : values)
        table.Add({value.value, std::to_string(value.count)});
    Output output(true);
    output.Write(table.Write(format, hasHeader));
    output.Finish();
}

void Print(const std::list<std::string> &values, const Options &options, OutputFormat format,
           Output &output) {
    JsonLines lines(format == OutputFormat::Json);
    std::string text;
    if (IsCsv(format) && !options.noHeader)
        text = options.attribute + "\r\n";
    lines.Begin(text);
    for (const std::string &value : values) {
        if (IsCsv(format)) {
            AppendCsvLine(text, {value}, CsvStyleOf(format));
        } else if (format == OutputFormat::Text) {
            text += EscapeForTerminal(value) + "\n";
        } else {
            lines.BeginItem(text);
            AppendJsonString(text, value);
            lines.EndItem(text);
        }
        output.Write(text);
        text.clear();
    }
    lines.End(text);
    output.Write(text);
    output.Finish();
}

int Run(const Options &options, const std::string &root) {
    RequireAttribute(options.attribute);
    const OutputFormat format = ParseOutputFormat(options.format);
    if (format == OutputFormat::Short)
        throw UsageError(
            "--output: values have no form 'short'; forms are text, json, jsonl, csv, spreadsheet");
    const LogTable table = ResolveLogTable(options.table, root);
    if (table.kind != TableKind::Logs)
        throw UsageError("--log: values are known of table logs only, not of '" + options.table.log + "'");
    ApplyUtc(options.inUtc);
    if (options.hasCounts) {
        const std::vector<ValueCount> counts = ReadCounts(options, table);
        PrintCounts(counts, !options.noHeader, format);
        return counts.empty() ? kExitNothing : kExitFound;
    }
    std::list<std::string> values;
    if (IsEmpty(options.filter)) {
        values = ReadValues(options, table);
    } else {
        for (ValueCount &value : ReadCounts(options, table))
            values.push_back(std::move(value.value));
    }
    Output output(true);
    Print(values, options, format, output);
    return values.empty() ? kExitNothing : kExitFound;
}

} // namespace

void AddValues(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "values", "Print the distinct values of a column of table logs",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    OfferWords(
        command.AddText("attribute", options->attribute, "",
                        "host, ip, fac, prio, llevel, tag, utcsec, tzoffset, ldate, ltime, prog, msg or id"),
        AttributeNames())
        .Required();
    AddFilterOptions(command, options->filter);
    command.AddFlag("--counts", options->hasCounts,
                    "With the number of logs that have each value, the most frequent value first");
    command.AddText("-n,--lines", options->lines, "N", "The first N values");
    command.AddText("--offset", options->offset, "N", "Skip N values first");
    OfferWords(command.AddText("-o,--output", options->format, "FORMAT",
                               "text (default), json, jsonl, csv, spreadsheet (csv without formulas)"),
               {"text", "json", "jsonl", "csv", "spreadsheet"});
    command.AddFlag("--no-header", options->noHeader,
                    "No heading in csv and spreadsheet, and of counts in text");
    AddUtcOption(command, options->inUtc);
    AddTableOptions(command, options->table, false);
    AddPartialOption(command, options->table);
}

} // namespace kelo::tool
