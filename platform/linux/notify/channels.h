#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "notify/settings.h"

namespace kelo::platform {

// The channels of the notification `tag`: those that the settings enable and the filter file at `filterFile`
// allows. An unreadable filter file is taken as absent, and is reported, so that no notification is lost.
std::vector<std::string_view> WantedChannels(const Settings &settings, const std::string &filterFile,
                                             std::string_view tag);

} // namespace kelo::platform
