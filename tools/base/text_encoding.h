#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace kelo::tool {

// Logs hold whatever bytes a sender chose. These functions make a text safe for the place it goes to.

// The text on one line of a terminal: control characters, characters that turn the writing direction and
// bytes that are no UTF-8 are written as "\n", "\t", "\x1b" or "\u202e". Everything else, backslashes
// included, stays.
std::string EscapeForTerminal(std::string_view text);

// Number of characters of a text that is UTF-8, which is the number of its columns for most scripts.
size_t CharacterCount(std::string_view text);

// Length in bytes of the first `count` characters of a text that is UTF-8.
size_t FirstCharacters(std::string_view text, size_t count);

// Length in bytes of the whole characters within the first `maxBytes` of a text that is UTF-8.
size_t WholeCharacters(std::string_view text, size_t maxBytes);

// Appends the text as a JSON string with its quotes: control characters are escaped, and each byte that is no
// UTF-8 becomes U+FFFD.
void AppendJsonString(std::string &out, std::string_view text);

// The text with those of the characters & < > " ' as entities that are in `characters`.
std::string EscapeMarkup(std::string_view text, std::string_view characters);

// Appends a record of RFC 4180 with its line end: fields stand between double quotes where they need them,
// and their bytes are unchanged.
void AppendCsvLine(std::string &out, const std::vector<std::string> &fields);

} // namespace kelo::tool
