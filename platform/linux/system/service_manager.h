#pragma once

#include <string>

namespace kelo::platform {

// Whether systemd manages the services of this machine; never in a library that was built without it.
bool IsSystemdRunning();

// Asks systemd over the system bus to reload a unit ("syslog-ng.service") and waits for the outcome. A reload
// that is already in progress, requested by any program, is awaited instead; one that has not begun is merged
// with ours by systemd itself.
//
// Returns "" when the unit was reloaded, else the reason.
std::string ReloadUnit(const std::string &unit);

} // namespace kelo::platform
