#pragma once

#include <string>
#include <string_view>

namespace kelo::tool {

// The text on one line without control characters, in valid UTF-8, cut at a character to `maxBytes`.
std::string SafeLine(std::string_view text, size_t maxBytes);

// The same for a text of several lines: line feeds and tabs stay.
std::string SafeLines(std::string_view text, size_t maxBytes);

} // namespace kelo::tool
