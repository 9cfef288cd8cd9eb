#pragma once

#include <string>

namespace kelo::platform {

// Asks systemd over the system bus to reload a unit ("syslog-ng.service") and waits for the outcome. A reload
// that has been asked for but not begun serves both who asked; systemd sees to that.
//
// Returns "" when the unit was reloaded, else the reason.
std::string ReloadUnit(const std::string &unit);

} // namespace kelo::platform
