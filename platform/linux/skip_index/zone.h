#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <string_view>

namespace kelo::platform {

// The columns of times: "utcsec", and "ldate" as a number.
enum class TimeColumn : uint8_t { kSecond, kDay };

// Times from the first to the last one, both included; none if the first is later.
struct TimeSpan {
    int64_t first = std::numeric_limits<int64_t>::max();
    int64_t last = std::numeric_limits<int64_t>::min();

    void Add(const TimeSpan &other) {
        first = std::min(first, other.first);
        last = std::max(last, other.last);
    }
    bool Touches(const TimeSpan &other) const { return first <= other.last && other.first <= last; }
};
inline constexpr TimeSpan kAllTimes = {std::numeric_limits<int64_t>::min(),
                                       std::numeric_limits<int64_t>::max()};

// 20200102 for "2020/01/02"; nothing for a text of another form. Numbers compare as the texts do.
std::optional<int64_t> NumberOfDay(std::string_view text);

// What the times of the rows of neighbouring blocks are in, of each column. A zone has the blocks of a word
// of a slice.
using Zone = std::array<TimeSpan, 2>;
inline constexpr size_t kZonesPerPiece = 8;

// The zones of a piece, as they are in the file.
struct ZoneMap {
    std::array<Zone, kZonesPerPiece> zones;
    uint64_t checksum;
};
static_assert(sizeof(ZoneMap) == kZonesPerPiece * 32 + 8);

// The check sum of the zones of `piece`, which depends on their place as that of a slice does.
uint64_t ChecksumOf(const ZoneMap &map, uint64_t fileNumber, int64_t piece);

} // namespace kelo::platform
