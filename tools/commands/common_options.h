#pragma once

#include <string>

#include "cli/program.h"
#include "print/key_values.h"
#include "print/output.h"
#include "print/record_formatter.h"
#include "read/log_filter.h"
#include "read/log_table.h"

namespace kelo::tool {

// Options that several subcommands share. Each struct must outlive the use of the command line.

// --db, --log and --table.
void AddTableOptions(Command command, LogTableOptions &options, bool withTable = true);

// --partial, of the commands that read.
void AddPartialOption(Command command, LogTableOptions &options);

// --since, --until, --priority, --facility, --host, --program and --grep.
void AddFilterOptions(Command command, LogFilter &filter);

// --utc. It sets the time zone of the process, so that times are also read as UTC.
void AddUtcOption(Command command, bool &inUtc);
void ApplyUtc(bool inUtc);

struct OutputOptions {
    std::string format = "text";
    std::string fields;
    std::string colour = "auto";
    bool noHeader = false;
    bool noPager = false;
    bool inUtc = false;
};

// --output, --fields, --no-header, --utc, --color and --no-pager.
void AddOutputOptions(Command command, OutputOptions &options);

// The options for a table of this kind. Throws UsageError.
RecordLayout MakeLayout(const OutputOptions &options, TableKind kind);

// --output of the commands that print text or one JSON object.
void AddKeyValuesFormat(Command command, std::string &format);
// The format of that name. Throws UsageError for any but text and json.
OutputFormat ParseKeyValuesFormat(const std::string &format);

} // namespace kelo::tool
