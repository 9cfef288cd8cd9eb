#pragma once

#include <string>

namespace kelo::platform {

// Tells the system log (priority LOG_WARNING) why something in the file at `path` is not accepted; with a
// line number above 0, where. Leaves errno alone. `reason` shows nothing secret.
void ReportRefusal(const std::string &path, size_t line, const std::string &reason);

} // namespace kelo::platform
