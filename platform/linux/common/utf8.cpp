#include "common/utf8.h"

#include <utf8.h>

#include <algorithm>
#include <cstdint>
#include <cstring>

namespace kelo::platform {
namespace {

bool IsAscii(char byte) {
    return static_cast<uint8_t>(byte) < 0x80;
}

// Takes the leading ASCII bytes off the text: nearly all log text, eight at a time.
std::string_view TakeAscii(std::string_view &text) {
    size_t length = 0;
    for (uint64_t block; length + sizeof(block) <= text.size(); length += sizeof(block)) {
        std::memcpy(&block, text.data() + length, sizeof(block));
        if ((block & 0x8080808080808080U) != 0)
            break;
    }
    while (length < text.size() && IsAscii(text[length]))
        ++length;
    const std::string_view ascii = text.substr(0, length);
    text.remove_prefix(length);
    return ascii;
}

// Takes the leading other bytes off the text. They are whole characters, for ASCII is part of no other.
std::string_view TakeOthers(std::string_view &text) {
    const auto length = static_cast<size_t>(std::find_if(text.begin(), text.end(), IsAscii) - text.begin());
    const std::string_view others = text.substr(0, length);
    text.remove_prefix(length);
    return others;
}

// The text with what `repair` makes of every byte that is not part of well-formed UTF-8.
template <typename Repair>
std::string Repaired(std::string_view text, Repair repair) {
    std::string result;
    result.reserve(text.size());
    while (!text.empty()) {
        result.append(TakeAscii(text));
        std::string_view others = TakeOthers(text);
        while (!others.empty()) {
            const size_t valid = std::min(utf8::find_invalid(others), others.size());
            result.append(others.substr(0, valid));
            others.remove_prefix(valid);
            if (others.empty())
                break;
            repair(result, static_cast<uint8_t>(others.front()));
            others.remove_prefix(1);
        }
    }
    return result;
}

} // namespace

bool IsUtf8(std::string_view text) {
    for (;;) {
        TakeAscii(text);
        if (text.empty())
            return true;
        if (!utf8::is_valid(TakeOthers(text)))
            return false;
    }
}

std::string ToUtf8(std::string_view text) {
    return Repaired(text, [](std::string &result, uint8_t byte) { utf8::append(char32_t{byte}, result); });
}

std::string ToValidUtf8(std::string_view text) {
    return Repaired(text, [](std::string &result, uint8_t) { result.append("\xEF\xBF\xBD"); });
}

} // namespace kelo::platform
