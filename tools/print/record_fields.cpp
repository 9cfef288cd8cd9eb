#include "print/record_fields.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <type_traits>

#include "base/errors.h"

namespace kelo::tool {
namespace {

using Log = _SYSLOG_LOG_DATA_tag;

constexpr unsigned Bit(TableKind kind) {
    return 1U << static_cast<unsigned>(kind);
}
constexpr unsigned kLogs = Bit(TableKind::Logs);
constexpr unsigned kSystem = Bit(TableKind::System);
constexpr unsigned kTransfer = Bit(TableKind::Transfer);
constexpr unsigned kAll = kLogs | kSystem | kTransfer;

using Digits = RecordField::Digits;

std::string_view SeverityOf(const Log &log, Digits &) {
    return g_MappingSyslogPrior[log.prio];
}

// The text or the number that is this member of a record.
template <auto Member>
std::string_view TextOf(const Log &log, Digits &digits) {
    if constexpr (std::is_same_v<decltype(Member), std::string Log::*>)
        return log.*Member;
    else
        return TextOfNumber(log.*Member, digits);
}

// "llevel" of table "logs" is the same as "prio", which is shown for both.
constexpr std::array<RecordField, 21> kFields = {{
    {"id", true, kAll, 0, TextOf<&Log::id>},
    {"time", false, kAll, kAll, [](const Log &, Digits &) { return std::string_view(); }},
    {"utcsec", true, kLogs, 0, TextOf<&Log::utcsec>},
    {"tzoffset", false, kLogs, 0, TextOf<&Log::tzoffset>},
    {"ldate", false, kAll, 0, TextOf<&Log::ldate>},
    {"ltime", false, kAll, 0, TextOf<&Log::ltime>},
    {"prio", false, kLogs, kLogs, SeverityOf},
    {"llevel", false, kSystem, kSystem, SeverityOf},
    {"fac", false, kLogs, 0, TextOf<&Log::fac>},
    {"tag", false, kLogs, 0, TextOf<&Log::tag>},
    {"host", false, kAll, kAll, TextOf<&Log::host>},
    {"ip", false, kLogs, 0, TextOf<&Log::ip>},
    {"ip", false, kTransfer, kTransfer, TextOf<&Log::xferip>},
    {"prog", false, kAll, kLogs | kSystem, TextOf<&Log::prog>},
    {"luser", false, kSystem | kTransfer, kSystem | kTransfer, TextOf<&Log::luser>},
    {"event", false, kTransfer, kTransfer, TextOf<&Log::event>},
    {"isdir", true, kTransfer, 0, TextOf<&Log::isdir>},
    {"fsize", false, kTransfer, kTransfer, TextOf<&Log::fsize>},
    {"fname", false, kTransfer, kTransfer, TextOf<&Log::fname>},
    {"msg", false, kLogs, kLogs, TextOf<&Log::msg>},
    {"msg", false, kSystem, kSystem, TextOf<&Log::event>},
}};

RecordFields Choose(unsigned RecordField::*tables, TableKind kind) {
    RecordFields fields;
    for (const RecordField &field : kFields) {
        if ((field.*tables & Bit(kind)) != 0)
            fields.push_back(&field);
    }
    return fields;
}

const RecordField &FindField(const std::string &name, TableKind kind) {
    const std::string known = name == "llevel" && kind == TableKind::Logs ? "prio" : name;
    std::string names;
    for (const RecordField *field : AllFields(kind)) {
        if (field->name == known)
            return *field;
        names += (names.empty() ? "" : ", ") + std::string(field->name);
    }
    throw UsageError("--fields: unknown field '" + name + "'; fields are " + names);
}

} // namespace

RecordFields AllFields(TableKind kind) {
    return Choose(&RecordField::tables, kind);
}

RecordFields SummaryFields(TableKind kind) {
    return Choose(&RecordField::summary, kind);
}

std::vector<std::string> FieldNames() {
    std::vector<std::string> names;
    for (const RecordField &field : kFields) {
        if (std::find(names.begin(), names.end(), field.name) == names.end())
            names.emplace_back(field.name);
    }
    return names;
}

RecordFields ParseFields(const std::string &names, TableKind kind) {
    RecordFields fields;
    for (size_t begin = 0; begin <= names.size();) {
        const size_t end = std::min(names.find(',', begin), names.size());
        fields.push_back(&FindField(names.substr(begin, end - begin), kind));
        begin = end + 1;
    }
    return fields;
}

bool IsTime(const RecordField &field) {
    return &field == &kFields[1];
}

bool IsMessage(const RecordField &field) {
    return std::string_view(field.name) == "msg";
}

std::string RecordTime(const Log &log, TableKind kind, const TimeFormat &format,
                       std::string (TimeFormat::*form)(int64_t) const) {
    if (kind == TableKind::Logs)
        return (format.*form)(log.utcsec);
    std::string time = log.ldate + " " + log.ltime;
    std::replace(time.begin(), time.end(), '/', '-');
    return time;
}

std::string RecordMessage(const Log &log, TableKind kind) {
    if (kind == TableKind::Transfer)
        return log.luser + " (" + log.xferip + ") " + log.event + " " + log.fname + " " + log.fsize;
    return kind == TableKind::System ? log.event : log.msg;
}

} // namespace kelo::tool
