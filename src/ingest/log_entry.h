#pragma once

#include <string_view>

#include "kelosyslog/records.h"

namespace kelo {

// Parses one line into `record`, field by field. Returns false when it has fewer than eleven fields; these
// are then in `record`.
bool ParseLogEntry(std::string_view line, _SYSLOG_LOG_DATA_tag &record);

} // namespace kelo
