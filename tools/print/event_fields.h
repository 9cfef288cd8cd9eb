#pragma once

#include "print/record_fields.h"
#include "read/event_log.h"

namespace kelo::tool {

// An event as the record that a RecordFormatter prints with EventFields: id, time, level, user and event.
_SYSLOG_LOG_DATA_tag RecordOfEvent(const Event &event);
RecordFields EventFields();

} // namespace kelo::tool
