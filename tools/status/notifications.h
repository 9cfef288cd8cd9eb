#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "spool/channel_health.h"

namespace kelo::tool {

// The state of the notifications.
struct NotificationStatus {
    std::string path; // of the spool
    size_t waiting = 0;
    size_t failed = 0;  // given up
    int64_t oldest = 0; // time of the oldest waiting one, seconds since the epoch; 0 when unknown
    std::vector<ChannelHealth> channels;
    std::string problem; // why the spool cannot be read; "" when it can, or does not exist
};

NotificationStatus GatherNotifications(const std::string &root);

} // namespace kelo::tool
