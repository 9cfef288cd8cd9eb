#pragma once

#include <memory>
#include <optional>
#include <string>

#include "base/text_encoding.h"
#include "kelosyslog/records.h"
#include "print/record_fields.h"

namespace kelo::tool {

enum class OutputFormat { Text, Short, Json, Jsonl, Csv, Spreadsheet };

inline bool IsCsv(OutputFormat format) {
    return format == OutputFormat::Csv || format == OutputFormat::Spreadsheet;
}
// For the standard output as it is.
CsvStyle CsvStyleOf(OutputFormat format);

// The format of this name ("text", "short", "json", "jsonl", "csv", "spreadsheet"). Throws UsageError naming
// --output.
OutputFormat ParseOutputFormat(const std::string &name);

struct RecordLayout {
    OutputFormat format = OutputFormat::Text;
    TableKind kind = TableKind::Logs;
    RecordFields fields; // empty for the format's default
    bool hasHeader = true;
    bool hasColour = false;
    bool inUtc = false;
    // A longer message is cut to so many bytes, or some fewer for a whole character; JSON has its length.
    std::optional<size_t> maxMessage = {};
};

// Formats records as text, one by one:
//
//     text    columns under a heading, each as wide as its widest value so far; one line per record
//     short   "Jan 02 10:11:12 host program: message"
//     json    one array of objects
//     jsonl   one object on each line
//     csv     RFC 4180 with a heading
//     spreadsheet    the same, and no text is taken for a formula
//
// Text and short make control characters visible (EscapeForTerminal); JSON is valid with any bytes in a
// record; CSV has them unchanged, except on a terminal.
class RecordFormatter {
public:
    virtual ~RecordFormatter() = default;

    // Each appends to `out`. Call Begin first and End last, also without a record.
    virtual void Begin(std::string &) {}
    virtual void Add(const _SYSLOG_LOG_DATA_tag &log, std::string &out) = 0;
    virtual void End(std::string &) {}
};

std::unique_ptr<RecordFormatter> MakeRecordWriter(RecordLayout layout);

} // namespace kelo::tool
