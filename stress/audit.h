#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "site.h"

namespace kelo::stress {

struct Findings {
    uint64_t tried = 0;
    uint64_t acknowledged = 0; // and not deleted
    uint64_t live = 0;         // found as rows, of the acknowledged ones
    uint64_t archived = 0;
    uint64_t aside = 0;
    uint64_t inBytes = 0;   // only as bytes of a file that was set aside
    uint64_t destroyed = 0; // not found: damage has overwritten them
    uint64_t atRisk = 0;    // not found: stored in a file whose write-ahead log was damaged
    std::vector<std::string> faults;
};

// Compares what the ledgers say with what the databases hold. No process may be left.
Findings Audit(const Site &site);

} // namespace kelo::stress
