#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace kelo::tool {

// What the accounting database at `path` says of the logs that came in.
struct AccountingStatus {
    int64_t newest = 0;       // stamp of the newest sample, seconds since the epoch; 0 when there is none
    double perSecond = 0;     // mean of the minute that ends with it
    double perSecondHour = 0; // the same of the hour
    uint64_t total = 0;       // logs of all devices since counting began
    std::vector<std::pair<std::string, uint64_t>> devices; // those that sent most, most first
};

// Reads a database that can be read; `devices` limits their number. Throws DatabaseError.
AccountingStatus GatherAccounting(const std::string &path, int devices);

} // namespace kelo::tool
