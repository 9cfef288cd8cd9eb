#include "search/utf8.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace kelo::platform {
namespace {

uint8_t ByteAt(std::string_view text, size_t at) {
    return static_cast<uint8_t>(text[at]);
}

// Number of leading ASCII bytes: nearly all log text, taken eight at a time.
size_t AsciiPrefix(std::string_view text) {
    size_t length = 0;
    for (uint64_t block; length + sizeof(block) <= text.size(); length += sizeof(block)) {
        std::memcpy(&block, text.data() + length, sizeof(block));
        if ((block & 0x8080808080808080U) != 0)
            break;
    }
    while (length < text.size() && ByteAt(text, length) < 0x80)
        ++length;
    return length;
}

// Length of the well-formed multi-byte sequence at the start of `text` (not empty), or 0.
size_t SequenceLength(std::string_view text) {
    const uint8_t lead = ByteAt(text, 0);
    if (lead < 0xC2 || lead > 0xF4)
        return 0;
    const size_t length = lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
    if (text.size() < length)
        return 0;
    // The second byte excludes overlong forms, surrogates and values above U+10FFFF.
    const uint8_t lowest = lead == 0xE0 ? 0xA0 : lead == 0xF0 ? 0x90 : 0x80;
    const uint8_t highest = lead == 0xED ? 0x9F : lead == 0xF4 ? 0x8F : 0xBF;
    if (ByteAt(text, 1) < lowest || ByteAt(text, 1) > highest)
        return 0;
    for (size_t at = 2; at < length; ++at) {
        if ((ByteAt(text, at) & 0xC0) != 0x80)
            return 0;
    }
    return length;
}

// Length of the well-formed beginning of `text`.
size_t Utf8Prefix(std::string_view text) {
    size_t length = AsciiPrefix(text);
    while (length < text.size()) {
        const size_t sequence = SequenceLength(text.substr(length));
        if (sequence == 0)
            break;
        length += sequence;
        length += AsciiPrefix(text.substr(length));
    }
    return length;
}

} // namespace

bool IsUtf8(std::string_view text) {
    return Utf8Prefix(text) == text.size();
}

std::string ToUtf8(std::string_view text) {
    std::string utf8;
    utf8.reserve(text.size());
    while (true) {
        const size_t valid = Utf8Prefix(text);
        utf8.append(text.substr(0, valid));
        if (valid == text.size())
            return utf8;
        const uint8_t byte = ByteAt(text, valid); // at least 0x80, so two bytes in UTF-8
        utf8 += static_cast<char>(0xC0 | (byte >> 6));
        utf8 += static_cast<char>(0x80 | (byte & 0x3F));
        text.remove_prefix(valid + 1);
    }
}

} // namespace kelo::platform
