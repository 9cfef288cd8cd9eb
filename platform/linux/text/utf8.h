#pragma once

#include <string>
#include <string_view>

namespace kelo::platform {

// The text with every byte that is not part of well-formed UTF-8 replaced by U+FFFD.
std::string ToValidUtf8(std::string_view text);

// The text, well-formed, on one line of printable characters: line feeds, carriage returns and tabs become
// blanks, other control bytes are written as "\x1B". Longer texts are cut at a character and end in "..."
// after at most `maxBytes` bytes.
std::string ToOneLine(std::string_view text, size_t maxBytes);

// The text, well-formed; line feeds and tabs stay, other control bytes are written as "\x1B".
std::string ToPlainText(std::string_view text);

} // namespace kelo::platform
