#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace kelo::tool {

// The counts of received records in the accounting database at `path`.
struct AccountingStatus {
    int64_t newest = 0;       // stamp of the newest sample, seconds since the epoch; 0 when there is none
    double perSecond = 0;     // mean of the minute that ends with it
    double perSecondHour = 0; // the same of the hour
    uint64_t total = 0;       // records of all devices since counting began
    std::vector<std::pair<std::string, uint64_t>> devices; // the busiest ones, most records first
};

// Reads a readable database; `devices` limits their number. Throws DatabaseError.
AccountingStatus GatherAccounting(const std::string &path, int devices);

} // namespace kelo::tool
