#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace kelo::tool {

// The volume of some of the system's folders.
struct VolumeStatus {
    std::vector<std::string> folders; // absolute; the nearest existing one if the system's own is missing
    uint64_t size = 0;                // bytes that ordinary users can fill
    uint64_t free = 0;                // free bytes of these

    double FreePercent() const;
    bool IsNearlyFull() const { return FreePercent() < 10; }
};

// The volumes of the databases, the archives, the disk-buffer of syslog-ng, the spool and the event log.
std::vector<VolumeStatus> GatherVolumes(const std::string &root);

} // namespace kelo::tool
