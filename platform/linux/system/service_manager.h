#pragma once

#include <string>

namespace kelo::platform {

// Asks systemd over the system bus to reload a unit ("syslog-ng.service") and waits for the outcome. A reload
// that is under way already, whoever asked for it, is awaited instead; one that has not begun systemd itself
// makes one with ours.
//
// Returns "" when the unit was reloaded, else the reason.
std::string ReloadUnit(const std::string &unit);

} // namespace kelo::platform
