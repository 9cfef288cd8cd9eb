#pragma once

#include <sys/types.h>

#include <string>

#include "network/settings.h"

namespace kelo::tool {

// The numeric address for what a user wrote: "any" is "::", or "0.0.0.0" on a machine without IPv6. Throws
// UsageError for anything that is not an address of this machine.
std::string ResolveListenAddress(const std::string &text);

// Checks before anything changes that syslog-ng can receive with these settings: the address is one of this
// machine, each port has one use, no other process than syslog-ng uses one, and the files for TLS are sound.
// `syslogNg` is its process, 0 for none. Throws UsageError, which names what does not fit.
void RequirePossible(const NetworkSettings &settings, const std::string &root, pid_t syslogNg);

} // namespace kelo::tool
