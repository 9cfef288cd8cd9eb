#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "notify/settings.h"

namespace kelo::platform {

// The channels that the notification `tag` is to go to: those that the settings enable, of which the filter
// file at `filterFile` may take some away. Never throws away what it cannot understand: an unreadable filter
// file counts as absent, and is reported.
std::vector<std::string_view> WantedChannels(const Settings &settings, const std::string &filterFile,
                                             std::string_view tag);

} // namespace kelo::platform
