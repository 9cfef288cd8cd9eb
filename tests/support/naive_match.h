#pragma once

// Matching by the definition, character by character: what searches through SQL are compared with.

#include <string>
#include <string_view>

namespace kelo::test {

// Whether the pattern matches the whole text. `star` stands for any text, `any` for one character of UTF-8.
inline bool NaiveMatch(std::string_view text, std::string_view pattern, char star = '*', char any = '?') {
    if (pattern.empty())
        return text.empty();
    if (pattern[0] == star)
        return NaiveMatch(text, pattern.substr(1), star, any) ||
               (!text.empty() && NaiveMatch(text.substr(1), pattern, star, any));
    if (text.empty() || (pattern[0] != any && pattern[0] != text[0]))
        return false;
    size_t length = 1;
    while (pattern[0] == any && length < text.size() &&
           (static_cast<unsigned char>(text[length]) & 0xC0) == 0x80)
        ++length;
    return NaiveMatch(text.substr(length), pattern.substr(1), star, any);
}

inline std::string LowerAscii(std::string text) {
    for (char &byte : text)
        byte = byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte + ('a' - 'A')) : byte;
    return text;
}

} // namespace kelo::test
