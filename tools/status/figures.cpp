#include "status/figures.h"

#include <algorithm>
#include <cstdio>

namespace kelo::tool {

std::string Grouped(uint64_t number) {
    std::string text = std::to_string(number);
    for (size_t at = text.size(); at > 3; at -= 3)
        text.insert(at - 3, 1, ',');
    return text;
}

std::string Counted(uint64_t number, const std::string &noun) {
    return Grouped(number) + " " + noun + (number == 1 ? "" : "s");
}

std::string Bytes(int64_t bytes) {
    constexpr const char *kUnits[] = {"KiB", "MiB", "GiB", "TiB"};
    if (bytes < 1024)
        return std::to_string(bytes) + " B";
    double amount = static_cast<double>(bytes) / 1024;
    size_t unit = 0;
    for (; amount >= 1023.95 && unit + 1 < std::size(kUnits); ++unit)
        amount /= 1024;
    char text[64];
    std::snprintf(text, sizeof text, amount < 9.95 ? "%.1f %s" : "%.0f %s", amount, kUnits[unit]);
    return text;
}

std::string Duration(int64_t seconds) {
    seconds = std::max<int64_t>(seconds, 0);
    if (seconds < 60)
        return std::to_string(seconds) + " s";
    if (seconds < 3600)
        return std::to_string(seconds / 60) + " min";
    if (seconds < 2 * 86400)
        return std::to_string(seconds / 3600) + " h";
    return std::to_string(seconds / 86400) + " d";
}

} // namespace kelo::tool
