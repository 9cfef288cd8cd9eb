#pragma once

#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace kelo::tool {

// Looks for bytes in texts, 16 at a time. `isSpecial` is a generic lambda of comparisons that are joined by
// '|', because it gets a byte as well as a vector of bytes:
//
//     IsFreeOf(text, [](auto bytes) { return (bytes == ',') | (bytes == '"'); })

template <size_t Size>
using ByteVector [[gnu::vector_size(Size)]] = unsigned char;

// Whether one of the bytes from `at` to `at + Size` is special.
template <size_t Size, typename IsSpecial>
bool HasSpecial(const char *at, IsSpecial isSpecial) {
    ByteVector<Size> bytes;
    std::memcpy(&bytes, at, Size);
    const auto found = isSpecial(bytes);
    std::array<uint64_t, Size / sizeof(uint64_t)> words;
    std::memcpy(words.data(), &found, Size);
    return std::any_of(words.begin(), words.end(), [](uint64_t word) { return word != 0; });
}

// Whether no byte of the text is special.
template <typename IsSpecial>
bool IsFreeOf(std::string_view text, IsSpecial isSpecial) {
    const char *at = text.data();
    const char *const end = at + text.size();
    if (text.size() >= 16) {
        for (; end - at > 16; at += 16) {
            if (HasSpecial<16>(at, isSpecial))
                return false;
        }
        return !HasSpecial<16>(end - 16, isSpecial);
    }
    if (text.size() >= 8)
        return !HasSpecial<8>(at, isSpecial) && !HasSpecial<8>(end - 8, isSpecial);
    return std::none_of(at, end, [&](char byte) { return isSpecial(static_cast<unsigned char>(byte)); });
}

// Where the first special byte of the text is, or its end.
template <typename IsSpecial>
const char *FindSpecial(const char *at, const char *end, IsSpecial isSpecial) {
    while (end - at >= 16 && !HasSpecial<16>(at, isSpecial))
        at += 16;
    return std::find_if(at, end, [&](char byte) { return isSpecial(static_cast<unsigned char>(byte)); });
}

} // namespace kelo::tool
