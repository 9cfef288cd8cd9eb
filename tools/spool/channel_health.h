#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "spool/settings.h"
#include "spool/spool.h"

namespace kelo::tool {

// Whether a channel works at present.
struct ChannelHealth {
    std::string name;
    bool isOn = false;
    std::string problem; // "" when it works, or is off
    int64_t next = 0;    // when it is tried again, seconds since the epoch; 0 when no attempt has failed
};

// All channels, in the order of kChannelNames. Throws SpoolError.
std::vector<ChannelHealth> ReadChannelHealth(const Spool &spool, const Settings &settings);

} // namespace kelo::tool
