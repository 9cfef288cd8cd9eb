#pragma once

#include <ctime>
#include <string>
#include <string_view>
#include <vector>

#include "notify/message.h"

namespace kelo::platform {

// One notification to deliver. docs/notification-spool.md describes its file.
struct SpoolEntry {
    std::string tag;
    std::string language;
    std::vector<std::string_view> channels;
    Message message;
    const TORVSZHASH *values = nullptr;
};

// The folder of the spool, under the platform's root.
std::string SpoolPath();

// Puts the entry into the spool, whose missing folders are created. True when it is on the
// disk; false with errno set, and then no part of it is left.
//
// While the calling thread holds notifications (notify_hold.h), the entry goes into the folder `held`.
bool AddToSpool(const SpoolEntry &entry);

} // namespace kelo::platform
