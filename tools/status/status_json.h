#pragma once

#include <string>

#include "status/server_status.h"

namespace kelo::tool {

// The status as one JSON object on one line, with the keys of docs/status.md.
std::string StatusJson(const ServerStatus &status);

} // namespace kelo::tool
