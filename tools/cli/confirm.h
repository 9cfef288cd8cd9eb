#pragma once

#include <string>

namespace kelo::tool {

// Asks on the terminal whether to do `action` ("delete 5 logs from ..."). Throws UsageError, which names
// `command` and the option --yes, if there is no terminal.
bool Confirm(const std::string &command, const std::string &action);

} // namespace kelo::tool
