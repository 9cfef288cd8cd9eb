#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "status/network.h"

namespace kelo::tool {

// The message spool as syslog-ng writes it. What is read of it the receiver says.
struct MessageSpoolStatus {
    std::string folder;            // "" when syslog-ng hands messages over in another way
    std::optional<uint64_t> bytes; // of its files; nothing when they cannot be listed
};

// Looks up the folder below `root` in the settings that `network` was gathered from, and its files.
MessageSpoolStatus GatherMessageSpool(const std::string &root, const NetworkStatus &network);

} // namespace kelo::tool
