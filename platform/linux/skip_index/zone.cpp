#include "skip_index/zone.h"

#include "skip_index/piece.h"

namespace kelo::platform {

static_assert(kZonesPerPiece == kWordsPerSlice);

std::optional<int64_t> NumberOfDay(std::string_view text) {
    constexpr std::string_view kForm = "dddd/dd/dd";
    if (text.size() != kForm.size())
        return std::nullopt;
    int64_t number = 0;
    for (size_t at = 0; at < text.size(); ++at) {
        const bool isDigit = text[at] >= '0' && text[at] <= '9';
        if (isDigit != (kForm[at] == 'd') || (!isDigit && text[at] != '/'))
            return std::nullopt;
        if (isDigit)
            number = 10 * number + (text[at] - '0');
    }
    return number;
}

uint64_t ChecksumOf(const ZoneMap &map, uint64_t fileNumber, int64_t piece) {
    const std::string_view bytes(reinterpret_cast<const char *>(map.zones.data()), sizeof map.zones);
    return HashOf(bytes, fileNumber + static_cast<uint64_t>(piece));
}

} // namespace kelo::platform
