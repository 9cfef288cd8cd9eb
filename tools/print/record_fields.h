#pragma once

#include <array>
#include <charconv>
#include <string>
#include <string_view>
#include <vector>

#include "base/time_format.h"
#include "kelosyslog/records.h"
#include "read/log_table.h"

namespace kelo::tool {

// One printable field of a record, with the name of its column. "time" is not a column: it is `utcsec` as
// text or, in tables without it, `ldate` and `ltime`.
struct RecordField {
    using Digits = std::array<char, 20>; // of a number with 64 bits

    const char *name;
    bool isNumber;
    unsigned tables;  // bit per TableKind: the tables that have it
    unsigned summary; // bit per TableKind: the tables that show it by default
    // The text of the field, which lies in `log` or, of a number, in `digits`.
    std::string_view (*text)(const _SYSLOG_LOG_DATA_tag &log, Digits &digits);
};

// The text of a number, in `digits`.
template <typename Number>
std::string_view TextOfNumber(Number number, RecordField::Digits &digits) {
    const char *end = std::to_chars(digits.begin(), digits.end(), number).ptr;
    return {digits.data(), static_cast<size_t>(end - digits.data())};
}

using RecordFields = std::vector<const RecordField *>;

// All fields of a table without duplicates, or those that are shown by default.
RecordFields AllFields(TableKind kind);
RecordFields SummaryFields(TableKind kind);

// The names of the fields of all tables, each once.
std::vector<std::string> FieldNames();

// The fields of a comma-separated list of names. Throws UsageError naming a name that the table does not
// have.
RecordFields ParseFields(const std::string &names, TableKind kind);

// Whether the field is "time", whose text depends on the time zone and on the form (RecordTime).
bool IsTime(const RecordField &field);

// Whether the field is the message, of any length.
bool IsMessage(const RecordField &field);

// The time of a record: `local` of its `utcsec`, or its own `ldate` and `ltime` in a table without `utcsec`.
std::string RecordTime(const _SYSLOG_LOG_DATA_tag &log, TableKind kind, const TimeFormat &format,
                       std::string (TimeFormat::*form)(int64_t) const);

// The message: the text, or for a transfer the action and the file.
std::string RecordMessage(const _SYSLOG_LOG_DATA_tag &log, TableKind kind);

} // namespace kelo::tool
