#include "skip_index/grams.h"

#include <algorithm>
#include <bit>
#include <cstring>

#include "common/utf8.h"

namespace kelo::platform {
namespace {

constexpr uint64_t kEachByte = 0x0101010101010101;
constexpr uint64_t kNotAscii = 0x80 * kEachByte;

// Eight bytes of text, with capital letters folded.
uint64_t Folded(uint64_t bytes) {
    const uint64_t low = bytes & ~kNotAscii;
    const uint64_t isFromA = low + (0x80 - 'A') * kEachByte;
    const uint64_t isBehindZ = low + (0x80 - 'Z' - 1) * kEachByte;
    const uint64_t isCapital = isFromA & ~isBehindZ & ~bytes & kNotAscii;
    return bytes | isCapital >> 2;
}

// Runs `use(gram)` for every gram of a text. Returns whether all of it is ASCII.
template <typename Use>
bool ForEachGram(std::string_view text, Use use) {
    constexpr size_t kOverlap = kGramBytes - 1;
    std::array<uint64_t, 64> folded;
    uint64_t all = 0;
    // A part at a time; the next one begins with the bytes whose grams are not complete yet.
    while (!text.empty()) {
        const size_t size = std::min(text.size(), sizeof folded);
        const size_t words = (size + sizeof(uint64_t) - 1) / sizeof(uint64_t);
        folded[words - 1] = 0;
        std::memcpy(folded.data(), text.data(), size);
        for (size_t word = 0; word < words; ++word) {
            all |= folded[word];
            folded[word] = Folded(folded[word]);
        }
        const auto *bytes = reinterpret_cast<const char *>(folded.data());
        for (size_t at = 0; at + kOverlap < size; ++at) {
            uint32_t gram = 0;
            std::memcpy(&gram, bytes + at, sizeof gram);
            if ((gram & static_cast<uint32_t>(kNotAscii)) == 0)
                use(gram);
        }
        text.remove_prefix(size < sizeof folded ? size : size - kOverlap);
    }
    return (all & kNotAscii) == 0;
}

// Two bits: with one, twice as many blocks of usual messages fit a word by chance; a third gains nothing.
std::array<uint16_t, 2> BitsOf(uint32_t gram) {
    const uint64_t hash = gram * 0x9E3779B97F4A7C15U;
    return {static_cast<uint16_t>(hash >> 52), static_cast<uint16_t>(hash << 12 >> 52)};
}

// Whether other bytes than its own may find a text that is not all ASCII.
bool IsAmbiguous(std::string_view text) {
    constexpr std::string_view kLongS = "\xC5\xBF";      // U+017F, an s
    constexpr std::string_view kKelvin = "\xE2\x84\xAA"; // U+212A, a k
    return !IsUtf8(text) || text.find(kLongS) != std::string_view::npos ||
           text.find(kKelvin) != std::string_view::npos;
}

} // namespace

void AddFlags(const GramFlags &flags, GramBits &bits) {
    // Moves the lowest bits of eight bytes to the highest byte, that of the first one to its lowest bit.
    constexpr uint64_t kGather =
        std::endian::native == std::endian::little ? 0x0102040810204080 : 0x8040201008040201;
    for (size_t at = 0; at < flags.size(); at += 8) {
        uint64_t eight = 0;
        std::memcpy(&eight, &flags[at], sizeof eight);
        bits[at / 64] |= (eight * kGather >> 56) << (at % 64);
    }
}

void AddGrams(std::string_view text, GramFlags &flags) {
    const bool isAscii = ForEachGram(text, [&](uint32_t gram) {
        for (const uint16_t bit : BitsOf(gram))
            flags[bit] = 1;
    });
    if (!isAscii && IsAmbiguous(text))
        flags.fill(1);
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

std::vector<uint16_t> BitsOfLiteral(std::string_view literal, size_t most) {
    std::vector<uint16_t> bits;
    ForEachGram(literal, [&](uint32_t gram) {
        for (const uint16_t bit : BitsOf(gram))
            bits.push_back(bit);
    });
    std::sort(bits.begin(), bits.end()); // by their hash, so that the first ones are spread
    bits.erase(std::unique(bits.begin(), bits.end()), bits.end());
    bits.resize(std::min(bits.size(), most));
    return bits;
}

} // namespace kelo::platform
