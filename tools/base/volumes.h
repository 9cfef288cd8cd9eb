#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace kelo::tool {

// The volume of some of the system's folders.
struct VolumeStatus {
    enum class Level { Good, NearlyFull, Full }; // at 10 % and at kFullBytes of free space
    static constexpr uint64_t kFullBytes = 16 * 1024 * 1024;

    std::vector<std::string> folders; // absolute; the nearest existing one if the system's own is missing
    uint64_t size = 0;                // bytes that ordinary users can fill
    uint64_t free = 0;                // free bytes of these

    double FreePercent() const;
    Level FreeLevel() const;
};

// The volumes of the databases, the archives, the disk buffer of syslog-ng, the spool and the event log, and
// of `folder` if it is not empty. Their order is fixed.
std::vector<VolumeStatus> GatherVolumes(const std::string &root, const std::string &folder = "");

// The one of `folder` among these.
VolumeStatus VolumeOf(const std::string &root, const std::string &folder);

} // namespace kelo::tool
