#pragma once

#include <optional>
#include <string>

#include "retention/rule.h"

namespace kelo::tool {

// The rule of retention of the working log.
struct RetentionStatus {
    std::optional<RetentionRule> rule;
    std::string problem;             // why it is not followed; "" if it is, or if there is none
    bool isReceptionStopped = false; // as its volume had too little free space
};

RetentionStatus GatherRetention(const std::string &root);

} // namespace kelo::tool
