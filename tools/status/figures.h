#pragma once

#include <cstdint>
#include <string>

namespace kelo::tool {

// Figures in readable form.

// "1,234,567"
std::string Grouped(uint64_t number);
// "1 source", "1,234 sources"
std::string Counted(uint64_t number, const std::string &noun);
// "512 B", "1.5 KiB", "20 GiB"
std::string Bytes(int64_t bytes);
// In the largest unit that is full, rounded down: "45 s", "3 min", "5 h", "12 d". Less than 0 counts as 0.
std::string Duration(int64_t seconds);

} // namespace kelo::tool
