#include "skip_index/grams.h"

#include <algorithm>

#include "common/utf8.h"

namespace kelo::platform {
namespace {

constexpr uint32_t kNotAscii = 0x80808080;

constexpr std::array<uint8_t, 256> kFolded = [] {
    std::array<uint8_t, 256> folded{};
    for (size_t byte = 0; byte < folded.size(); ++byte)
        folded[byte] = static_cast<uint8_t>(byte >= 'A' && byte <= 'Z' ? byte + ('a' - 'A') : byte);
    return folded;
}();

uint32_t Shifted(uint32_t gram, char byte) {
    return gram << 8 | kFolded[static_cast<uint8_t>(byte)];
}

uint16_t BitOf(uint32_t gram) {
    return static_cast<uint16_t>((gram * 0x9E3779B1U) >> 20);
}

bool IsAscii(std::string_view text) {
    return std::all_of(text.begin(), text.end(), [](char byte) { return static_cast<uint8_t>(byte) < 0x80; });
}

// Whether other bytes than those of the text may find it.
bool IsAmbiguous(std::string_view text) {
    constexpr std::string_view kLongS = "\xC5\xBF";      // U+017F, an s
    constexpr std::string_view kKelvin = "\xE2\x84\xAA"; // U+212A, a k
    if (text.find('\0') != std::string_view::npos)
        return true;
    return !IsAscii(text) && (!IsUtf8(text) || text.find(kLongS) != std::string_view::npos ||
                              text.find(kKelvin) != std::string_view::npos);
}

} // namespace

void AddGrams(std::string_view text, GramBits &bits) {
    if (IsAmbiguous(text))
        return bits.fill(~uint64_t{0});
    uint32_t gram = kNotAscii; // until four bytes were read
    for (const char byte : text) {
        gram = Shifted(gram, byte);
        const uint16_t bit = BitOf(gram);
        bits[bit / 64] |= uint64_t{(gram & kNotAscii) == 0} << (bit % 64);
    }
}

std::array<uint16_t, kBitsPerToken> BitsOfToken(TokenColumn column, std::string_view value) {
    uint64_t hash = 0xCBF29CE484222325U + static_cast<uint64_t>(column); // FNV-1a
    for (const char byte : value)
        hash = (hash ^ static_cast<uint8_t>(byte)) * 0x100000001B3U;
    std::array<uint16_t, kBitsPerToken> bits;
    for (uint16_t &bit : bits) {
        hash = (hash ^ (hash >> 32)) * 0x9E3779B97F4A7C15U;
        bit = static_cast<uint16_t>(hash >> 52);
    }
    return bits;
}

std::vector<uint16_t> GramsOfLiteral(std::string_view literal, size_t most) {
    std::vector<uint16_t> bits;
    uint32_t gram = kNotAscii;
    for (const char byte : literal) {
        gram = Shifted(gram, byte);
        if ((gram & kNotAscii) == 0)
            bits.push_back(BitOf(gram));
    }
    std::sort(bits.begin(), bits.end()); // by their hash, so that the first ones are spread
    bits.erase(std::unique(bits.begin(), bits.end()), bits.end());
    bits.resize(std::min(bits.size(), most));
    return bits;
}

} // namespace kelo::platform
