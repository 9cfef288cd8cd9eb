#pragma once

#include <string>
#include <string_view>

namespace kelo::platform {

// The text, with U+FFFD for every byte that is not part of well-formed UTF-8, on one line of printable
// characters: line feeds, carriage returns and tabs become blanks, other control bytes are written as "\x1B".
// Longer texts are cut at a character and end in "..." after at most `maxBytes` bytes.
std::string ToOneLine(std::string_view text, size_t maxBytes);

// The same for a text of several lines: line feeds and tabs stay, other control bytes are written as "\x1B".
std::string ToPlainText(std::string_view text);

} // namespace kelo::platform
