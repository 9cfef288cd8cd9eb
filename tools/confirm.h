#pragma once

#include <string>

namespace kelo::tool {

// Asks "Delete WHAT? [y/N]" on the terminal. Throws UsageError that names `command` and --yes where there is
// no terminal to ask on.
bool ConfirmDeletion(const std::string &command, const std::string &what);

} // namespace kelo::tool
