#pragma once

#include <cstdint>
#include <random>

#include "site.h"

namespace kelo::stress {

struct Options {
    int64_t seconds = 60;
    uint64_t seed = std::random_device()();
};

// Lets the crew work and disturbs it, and compares what was promised with what is there. Prints what it did
// and found. Returns whether nothing was wrong.
bool Run(const Site &site, const Options &options);

} // namespace kelo::stress
