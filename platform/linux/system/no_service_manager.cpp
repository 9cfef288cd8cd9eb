// For a library that is built without systemd.

#include "system/service_manager.h"

namespace kelo::platform {

bool IsSystemdRunning() {
    return false;
}

std::string ReloadUnit(const std::string &unit) {
    return "built without systemd, which manages " + unit;
}

} // namespace kelo::platform
