#pragma once

#include <string>
#include <string_view>

namespace kelo::platform {

// Whether the text is well-formed UTF-8 (no overlong forms, no surrogates).
bool IsUtf8(std::string_view text);

// The text with every byte that is not part of well-formed UTF-8 read as Latin-1, so that it is UTF-8.
std::string ToUtf8(std::string_view text);

// The text with every byte that is not part of well-formed UTF-8 replaced by U+FFFD.
std::string ToValidUtf8(std::string_view text);

} // namespace kelo::platform
