#pragma once

#include <cstdint>
#include <cstdlib>
#include <string>

namespace kelo::tool {

// The number in a column of a database, whose texts may be anything: what follows the digits does not count,
// a text without them is 0, and a number beyond the range is the nearest in it.
inline int64_t SignedNumber(const std::string &text) {
    return std::strtoll(text.c_str(), nullptr, 10);
}
inline uint64_t UnsignedNumber(const std::string &text) {
    return SignedNumber(text) < 0 ? 0 : std::strtoull(text.c_str(), nullptr, 10);
}

} // namespace kelo::tool
