#pragma once

#include <string>

namespace kelo::platform {

// Reports to the system log (priority LOG_WARNING) why something in the file at `path` is not accepted, and
// where, if the line number is above 0. Keeps errno. `reason` contains nothing secret.
void ReportRefusal(const std::string &path, size_t line, const std::string &reason);

// Sets errno to `cause`. Returns -1, the result of the caller.
int FailWith(int cause);

} // namespace kelo::platform
