#include "print/event_fields.h"

#include <array>
#include <iterator>

namespace kelo::tool {
namespace {

// An event is passed as a record: its level's name as `tag`, its user and text under their own names.
using Log = _SYSLOG_LOG_DATA_tag;
using Digits = RecordField::Digits;

constexpr std::array<RecordField, 4> kEventFields = {{
    {"id", true, 0, 0, [](const Log &log, Digits &digits) { return TextOfNumber(log.id, digits); }},
    {"level", false, 0, 0, [](const Log &log, Digits &) { return std::string_view(log.tag); }},
    {"user", false, 0, 0, [](const Log &log, Digits &) { return std::string_view(log.luser); }},
    {"event", false, 0, 0, [](const Log &log, Digits &) { return std::string_view(log.event); }},
}};

} // namespace

_SYSLOG_LOG_DATA_tag RecordOfEvent(const Event &event) {
    constexpr _SYSLOG_DB_PRIORITY_tag kColours[] = {SYSLOG_PRIO_INFO, SYSLOG_PRIO_WARNING, SYSLOG_PRIO_ERR};
    _SYSLOG_LOG_DATA_tag log;
    log.id = static_cast<uint64_t>(event.id);
    log.utcsec = event.time;
    log.prio =
        kColours[event.level >= 0 && event.level < static_cast<int>(std::size(kColours)) ? event.level : 0];
    log.tag = EventLevelName(event.level);
    log.luser = event.user;
    log.event = event.event;
    return log;
}

RecordFields EventFields() {
    RecordFields fields;
    for (const RecordField &field : kEventFields)
        fields.push_back(&field);
    fields.insert(fields.begin() + 1, ParseFields("time", TableKind::Logs).front());
    return fields;
}

} // namespace kelo::tool
