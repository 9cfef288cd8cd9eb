#include "commands/common_options.h"

#include <cstdlib>
#include <ctime>

#include "base/errors.h"
#include "cli/completion.h"
#include "read/severity_filter.h"

namespace kelo::tool {

void AddTableOptions(CLI::App &command, LogTableOptions &options, bool withTable) {
    const std::string group = "Where to look";
    AddText(command, "--db", options.db, "PATH", "This log database")->group(group);
    OfferLogs(AddText(command, "--log", options.log, "NAME",
                      "One of the system's logs: " + KnownLogNames() +
                          " (default: logs), or an archive by its name"),
              LogNames())
        ->group(group);
    if (withTable)
        OfferWords(
            AddText(command, "--table", options.table, "TABLE",
                    "logs (default), general_log, connection_log or transfer_log; the last three have no "
                    "facility and take times from ldate and ltime, and a transfer_log has no level and no "
                    "message"),
            {"logs", "general_log", "connection_log", "transfer_log"})
            ->group(group);
}

void AddFilterOptions(CLI::App &command, LogFilter &filter) {
    const std::string group = "Which logs (values separated by commas are alternatives; '!value' excludes)";
    AddText(command, "-S,--since", filter.since, "TIME", "From this time on")->group(group);
    AddText(
        command, "-U,--until", filter.until, "TIME",
        "Up to this second; a day alone ends before it begins. TIME: 2020-01-02, '2020/01/02 10:11[:12]', "
        "10:11, today, 'yesterday 18:00', now, 1h or -1h, '2 days ago', @1577836800")
        ->group(group);
    OfferList(AddTexts(command, "-p,--priority", filter.severities, "LEVEL",
                       "Severity by name or number. A single one means it and all more severe; "
                       "warning..emerg is a range; err..err is err alone, and so is each of several"),
              SeverityNames())
        ->group(group);
    OfferList(AddTexts(command, "--facility", filter.facilities, "NAME", "Facility by name or number"),
              FacilityNames())
        ->group(group);
    AddTexts(command, "-H,--host", filter.hosts, "HOST", "Sending host; * and ? are wildcards")->group(group);
    AddTexts(command, "-t,--program", filter.programs, "PROGRAM", "Program; * and ? are wildcards")
        ->group(group);
    AddTexts(command, "-g,--grep", filter.keywords, "KEYWORDS",
             "Message: words that all occur, \"a phrase\", one OR other, -without, wild*card, /regex/; exact "
             "in case when it has capitals. Given twice, both must match")
        ->group(group);
}

void AddUtcOption(CLI::App &command, bool &inUtc) {
    command.add_flag("--utc", inUtc, "Read and print times in UTC, not in local time");
}

void ApplyUtc(bool inUtc) {
    if (!inUtc)
        return;
    setenv("TZ", "UTC0", 1);
    tzset();
}

void AddOutputOptions(CLI::App &command, OutputOptions &options) {
    const std::string group = "How to print";
    OfferWords(AddText(command, "-o,--output", options.format, "FORMAT",
                       "text (default), short, json (one array), jsonl (an object per line), csv, "
                       "spreadsheet (csv without formulas)"),
               {"text", "short", "json", "jsonl", "csv", "spreadsheet"})
        ->group(group);
    OfferList(AddText(command, "--fields", options.fields, "NAMES",
                      "These fields, in this order: column names, and 'time'. Default: what people read in "
                      "text, else all"),
              FieldNames())
        ->group(group);
    command.add_flag("--no-header", options.noHeader, "No heading in text, csv and spreadsheet")
        ->group(group);
    command.add_flag("--utc", options.inUtc, "Read and print times in UTC, not in local time")->group(group);
    AddText(command, "--color", options.colour, "WHEN",
            "auto (default: on a terminal, unless NO_COLOR is set), always, never")
        ->group(group);
    command.add_flag("--no-pager", options.noPager, "Do not start PAGER on a terminal")->group(group);
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

void AddKeyValuesFormat(CLI::App &command, std::string &format) {
    OfferWords(AddText(command, "-o,--output", format, "FORMAT", "text (default) or json (one object)"),
               {"text", "json"});
}

OutputFormat ParseKeyValuesFormat(const std::string &format) {
    const OutputFormat parsed = ParseOutputFormat(format);
    if (parsed != OutputFormat::Text && parsed != OutputFormat::Json)
        throw UsageError("--output: there is no form '" + format + "' of this; forms are text, json");
    return parsed;
}

} // namespace kelo::tool
