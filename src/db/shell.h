#pragma once

#include <string>

namespace kelo {

// Runs a command line through /bin/sh and waits for it. Returns whether it ran and ended with exit status 0.
bool RunShell(const std::string &commandLine);

} // namespace kelo
