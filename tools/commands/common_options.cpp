#include "commands/common_options.h"

#include <cstdlib>
#include <ctime>

#include "base/errors.h"
#include "cli/completion.h"
#include "read/severity_filter.h"

namespace kelo::tool {

void AddTableOptions(Command command, LogTableOptions &options, bool withTable) {
    const std::string group = "Where to look";
    command.AddText("--db", options.db, "PATH", "This log database").Group(group);
    OfferLogs(command.AddText("--log", options.log, "NAME",
                              "One of the system's logs: " + KnownLogNames() +
                                  " (default: logs), or an archive by its name"),
              LogNames())
        .Group(group);
    if (withTable)
        OfferWords(command.AddText(
                       "--table", options.table, "TABLE",
                       "logs (default), general_log, connection_log or transfer_log; the last three have no "
                       "facility and take times from ldate and ltime, and a transfer_log has no level and no "
                       "message"),
                   {"logs", "general_log", "connection_log", "transfer_log"})
            .Group(group);
}

void AddPartialOption(Command command, LogTableOptions &options) {
    command
        .AddFlag("--partial", options.partial,
                 "Of a cluster: do without servers that are away; a message says what is missing")
        .Group("Where to look");
}

void AddFilterOptions(Command command, LogFilter &filter) {
    const std::string group = "Which logs (values separated by commas are alternatives; '!value' excludes)";
    command.AddText("-S,--since", filter.since, "TIME", "From this time on").Group(group);
    command
        .AddText("-U,--until", filter.until, "TIME",
                 "Up to this second; a day alone ends before it begins. TIME: 2020-01-02, '2020/01/02 "
                 "10:11[:12]', "
                 "10:11, today, 'yesterday 18:00', now, 1h or -1h, '2 days ago', @1577836800")
        .Group(group);
    OfferList(command.AddTexts("-p,--priority", filter.severities, "LEVEL",
                               "Severity by name or number. A single one means it and all more severe; "
                               "warning..emerg is a range; err..err is err alone, and so is each of several"),
              SeverityNames())
        .Group(group);
    OfferList(command.AddTexts("--facility", filter.facilities, "NAME", "Facility by name or number"),
              FacilityNames())
        .Group(group);
    command.AddTexts("-H,--host", filter.hosts, "HOST", "Sending host; * and ? are wildcards").Group(group);
    command.AddTexts("-t,--program", filter.programs, "PROGRAM", "Program; * and ? are wildcards")
        .Group(group);
    command
        .AddTexts("--host-is", filter.hostNames, "NAME",
                  "Sending host of exactly this name: commas, wildcards and '!' mean themselves. Given "
                  "twice, either")
        .Group(group);
    command
        .AddTexts("--host-is-not", filter.otherHostNames, "NAME", "Any other host than the one of this name")
        .Group(group);
    command.AddTexts("--program-is", filter.programNames, "NAME", "Program of exactly this name")
        .Group(group);
    command.AddTexts("--program-is-not", filter.otherProgramNames, "NAME", "Any other program").Group(group);
    command
        .AddTexts(
            "-g,--grep", filter.keywords, "KEYWORDS",
            "Message: words that all occur, \"a phrase\", one OR other, -without, wild*card, /regex/; exact "
            "in case when it has capitals. Given twice, both must match")
        .Group(group);
}

void AddUtcOption(Command command, bool &inUtc) {
    command.AddFlag("--utc", inUtc, "Read and print times in UTC, not in local time");
}

void ApplyUtc(bool inUtc) {
    if (!inUtc)
        return;
    setenv("TZ", "UTC0", 1);
    tzset();
}

void AddOutputOptions(Command command, OutputOptions &options) {
    const std::string group = "How to print";
    OfferWords(command.AddText("-o,--output", options.format, "FORMAT",
                               "text (default), short, json (one array), jsonl (an object per line), csv, "
                               "spreadsheet (csv without formulas)"),
               {"text", "short", "json", "jsonl", "csv", "spreadsheet"})
        .Group(group);
    OfferList(
        command.AddText("--fields", options.fields, "NAMES",
                        "These fields, in this order: column names, and 'time'. Default: what people read in "
                        "text, else all"),
        FieldNames())
        .Group(group);
    command.AddFlag("--no-header", options.noHeader, "No heading in text, csv and spreadsheet").Group(group);
    command.AddFlag("--utc", options.inUtc, "Read and print times in UTC, not in local time").Group(group);
    command
        .AddText("--color", options.colour, "WHEN",
                 "auto (default: on a terminal, unless NO_COLOR is set), always, never")
        .Group(group);
    command.AddFlag("--no-pager", options.noPager, "Do not start PAGER on a terminal").Group(group);
}

RecordLayout MakeLayout(const OutputOptions &options, TableKind kind) {
    RecordLayout layout;
    layout.format = ParseOutputFormat(options.format);
    layout.kind = kind;
    if (!options.fields.empty()) {
        if (layout.format == OutputFormat::Short)
            throw UsageError("--fields: the form 'short' has fixed fields; use another --output");
        layout.fields = ParseFields(options.fields, kind);
    }
    layout.hasHeader = !options.noHeader;
    layout.inUtc = options.inUtc;
    layout.hasColour = WantsColour(ParseColourMode(options.colour));
    return layout;
}

void AddKeyValuesFormat(Command command, std::string &format) {
    OfferWords(command.AddText("-o,--output", format, "FORMAT", "text (default) or json (one object)"),
               {"text", "json"});
}

OutputFormat ParseKeyValuesFormat(const std::string &format) {
    const OutputFormat parsed = ParseOutputFormat(format);
    if (parsed != OutputFormat::Text && parsed != OutputFormat::Json)
        throw UsageError("--output: there is no form '" + format + "' of this; forms are text, json");
    return parsed;
}

} // namespace kelo::tool
