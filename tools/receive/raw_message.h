#pragma once

#include <string_view>

#include "kelosyslog/records.h"

namespace kelo::tool {

// Takes a message apart that syslog-ng has passed on as it came: one of the two common forms, which filter
// f_kelo_common of kelosyslog.conf describes. Sets the facility, severity, tag, host, program and text of
// `log` exactly as syslog-ng's parsers would. Returns false, without effect, for another form.
bool ParseRawMessage(std::string_view message, _SYSLOG_LOG_DATA_tag &log);

} // namespace kelo::tool
