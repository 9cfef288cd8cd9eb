#pragma once

#include <ctime>
#include <string>
#include <string_view>
#include <vector>

#include "notify/message.h"

namespace kelo::platform {

// One notification on its way. docs/notification-spool.md describes the file that carries it.
struct SpoolEntry {
    std::string tag;
    std::string language;
    std::vector<std::string_view> channels;
    Message message;
    const TORVSZHASH *values = nullptr;
};

// The folder that the spool stands in, under the platform's root.
std::string SpoolPath();

// Puts the entry into the spool, whose folders are created where they are missing. True when it is on the
// disk; false with errno set, and then no part of it is left.
bool AddToSpool(const SpoolEntry &entry);

} // namespace kelo::platform
