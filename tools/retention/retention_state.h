#pragma once

#include <string>

namespace kelo::tool {

// What the last run of the retention has left, so that each thing is reported once.
struct RetentionState {
    bool isLow = false;  // the volume had too little free space, and was not well above it since
    std::string problem; // why the rule is not followed; "" if it is

    bool operator==(const RetentionState &) const = default;
};

// The state below `root`; the default one if there is none.
RetentionState ReadRetentionState(const std::string &root);
// Throws OutputError.
void WriteRetentionState(const std::string &root, const RetentionState &state);

} // namespace kelo::tool
