#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "base/volumes.h"

namespace kelo::tool {

// How long records stay in the working log, as the administrator has written it:
//
//     keep="90d"            records that are older are removed
//     keep_size="20G"       the oldest records are removed while the log has more
//     min_free="5%"         what the volume of the log must have free, also as a size: "2G"
//     when_full="remove"    else: remove the oldest records, or "stop" receiving
struct RetentionRule {
    enum class WhenFull { kNothing, kRemove, kStop };

    std::string keep; // as it was written
    int64_t keepSec = 0;
    uint64_t keepBytes = 0; // 0: any size
    std::string minFree;    // as it was written
    uint64_t minFreeBytes = 0;
    WhenFull whenFull = WhenFull::kNothing;
};

std::string RetentionFilePath(const std::string &root);

// The rule below `root`, for a working log on `volume`; nothing if the file is missing or has no setting.
// Throws DatabaseError, which names the file, the line and the setting, for one that cannot be understood,
// has no effect or would remove nearly everything.
std::optional<RetentionRule> LoadRetentionRule(const std::string &root, const VolumeStatus &volume);

// One line.
std::string DescribeRetention(const RetentionRule &rule);

} // namespace kelo::tool
