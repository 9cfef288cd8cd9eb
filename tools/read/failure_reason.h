#pragma once

#include <string>

#include "kelosyslog/failure.h"

namespace kelo::tool {

// The reason of a failure as a part of a line that names `path` already. By default of the library's last
// one.
std::string WhyFailed(const std::string &path, const KELOFAILURE &failure = *SyslogFailureGet());

} // namespace kelo::tool
