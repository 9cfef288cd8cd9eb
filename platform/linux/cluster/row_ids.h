#pragma once

#include <algorithm>
#include <cstdint>
#include <limits>

#include "keloplatform/cluster.h"

namespace kelo::platform {

// The id of a row is its second of receipt, the number of its log server and a number of the message, from
// the highest bit down. docs/cluster.md says how the table makes it.
inline constexpr int kBitsBelowSecond = KELODB_CLUSTER_BITS_BELOW_SECOND;
inline constexpr int64_t kMaxSecond = (int64_t{1} << 33) - 1;

// The smallest id of a second.
constexpr int64_t FirstIdOfSecond(int64_t second) {
    return std::clamp<int64_t>(second, 0, kMaxSecond) << kBitsBelowSecond;
}

// Ids, both ends included; none if the first is above the last.
struct RowIds {
    int64_t first = 0;
    int64_t last = std::numeric_limits<int64_t>::max();

    RowIds And(const RowIds &other) const {
        return {std::max(first, other.first), std::min(last, other.last)};
    }
    // The range that has both.
    RowIds Or(const RowIds &other) const {
        return {std::min(first, other.first), std::max(last, other.last)};
    }
};

} // namespace kelo::platform
