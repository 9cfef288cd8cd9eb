#pragma once

#include <string>

#include "status/server_status.h"

namespace kelo::tool {

// The status in the text format of Prometheus, with the metrics of docs/status.md.
std::string StatusPrometheus(const ServerStatus &status);

} // namespace kelo::tool
