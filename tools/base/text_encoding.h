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

// Length in bytes of the whole characters within the first `maxBytes` of a text; of one that is no UTF-8
// there, `maxBytes`.
size_t WholeCharacters(std::string_view text, size_t maxBytes);

// Appends the text as a JSON string with its quotes: control characters, characters that turn the writing
// direction, and the line and paragraph separators are escaped, and each byte that is no UTF-8 becomes
// U+FFFD. Returns whether there was none of those.
bool AppendJsonString(std::string &out, std::string_view text);

// The bytes in Base64 (RFC 4648).
std::string Base64(std::string_view bytes);

// The text with those of the characters & < > " ' as entities that are in `characters`.
std::string EscapeMarkup(std::string_view text, std::string_view characters);

// The JSON with the characters that turn the writing direction and the line and paragraph separators as
// "\u202e": they can only be in its strings.
std::string EscapeDirections(std::string_view json);

struct CsvStyle {
    // Control characters are written as EscapeForTerminal does. Else the bytes of a field are unchanged.
    bool isForTerminal = false;
    // A text that a spreadsheet program would take for a formula begins with an apostrophe, which it hides.
    bool isForSpreadsheet = false;
};

// Appends a record of RFC 4180, field by field: they are between double quotes where they need them.
class CsvLine {
public:
    CsvLine(std::string &out, CsvStyle style) : out_(out), style_(style) {}
    void Add(std::string_view field);
    void End(); // the line end

private:
    std::string &out_;
    CsvStyle style_;
    bool isFirst_ = true;
    bool isEmpty_ = false; // a single field without a text
};

// The same for a whole record.
void AppendCsvLine(std::string &out, const std::vector<std::string> &fields, CsvStyle style = {});

} // namespace kelo::tool
