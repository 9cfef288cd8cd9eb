#include "base/text_encoding.h"

#include <cstdint>
#include <cstdio>

namespace kelo::tool {
namespace {

struct Character {
    uint32_t code = 0;
    size_t length = 1;
    bool isValid = false; // else one byte that belongs to no UTF-8 sequence
};

// Decodes the character at the front of a text that is not empty. Overlong forms, surrogates and values above
// U+10FFFF are invalid.
Character Decode(std::string_view text) {
    const auto byte = [&](size_t i) { return static_cast<uint8_t>(text[i]); };
    const uint8_t lead = byte(0);
    if (lead < 0x80)
        return {lead, 1, true};
    const size_t length = lead >= 0xc2 && lead <= 0xdf ? 2 : lead >= 0xe0 && lead <= 0xef ? 3 : 4;
    if (lead < 0xc2 || lead > 0xf4 || text.size() < length)
        return {lead, 1, false};
    uint32_t code = lead & (0x7fU >> length);
    for (size_t i = 1; i < length; ++i) {
        if ((byte(i) & 0xc0) != 0x80)
            return {lead, 1, false};
        code = code << 6 | (byte(i) & 0x3fU);
    }
    const bool isOverlong = (length == 3 && code < 0x800) || (length == 4 && code < 0x10000);
    if (isOverlong || (code >= 0xd800 && code <= 0xdfff) || code > 0x10ffff)
        return {lead, 1, false};
    return {code, length, true};
}

bool IsControl(uint32_t code) {
    return code < 0x20 || (code >= 0x7f && code < 0xa0);
}

bool TurnsDirection(uint32_t code) {
    return (code >= 0x202a && code <= 0x202e) || (code >= 0x2066 && code <= 0x2069);
}

void AppendEscape(std::string &out, const char *format, uint32_t code) {
    char text[16];
    const int length = std::snprintf(text, sizeof text, format, code);
    out.append(text, static_cast<size_t>(length));
}

// The escapes that JSON and C share; 0 for none.
char ShortEscape(uint32_t code) {
    switch (code) {
    case '\n':
        return 'n';
    case '\r':
        return 'r';
    case '\t':
        return 't';
    default:
        return 0;
    }
}

void AppendCsvField(std::string &out, std::string_view text) {
    if (text.find_first_of(",\"\r\n") == std::string_view::npos) {
        out += text;
        return;
    }
    out += '"';
    for (const char byte : text) {
        if (byte == '"')
            out += '"';
        out += byte;
    }
    out += '"';
}

} // namespace

std::string EscapeForTerminal(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    while (!text.empty()) {
        const Character character = Decode(text);
        const bool isSafe =
            character.isValid && !IsControl(character.code) && !TurnsDirection(character.code);
        if (isSafe)
            out.append(text, 0, character.length);
        else if (const char escape = ShortEscape(character.code); escape != 0)
            (out += '\\') += escape;
        else
            AppendEscape(out, character.isValid && character.code > 0x7f ? "\\u%04x" : "\\x%02x",
                         character.code);
        text.remove_prefix(character.length);
    }
    return out;
}

size_t CharacterCount(std::string_view text) {
    size_t count = 0;
    for (const char byte : text)
        count += (static_cast<uint8_t>(byte) & 0xc0) != 0x80;
    return count;
}

void AppendJsonString(std::string &out, std::string_view text) {
    out += '"';
    while (!text.empty()) {
        const Character character = Decode(text);
        if (!character.isValid)
            out += "\xef\xbf\xbd";
        else if (character.code == '"' || character.code == '\\')
            (out += '\\') += static_cast<char>(character.code);
        else if (const char escape = ShortEscape(character.code); escape != 0)
            (out += '\\') += escape;
        else if (IsControl(character.code))
            AppendEscape(out, "\\u%04x", character.code);
        else
            out.append(text, 0, character.length);
        text.remove_prefix(character.length);
    }
    out += '"';
}

void AppendCsvLine(std::string &out, const std::vector<std::string> &fields) {
    for (const std::string &field : fields) {
        if (&field != &fields.front())
            out += ',';
        AppendCsvField(out, field);
    }
    if (fields.size() == 1 && fields[0].empty())
        out += "\"\""; // an empty line would be no record to most readers
    out += "\r\n";
}

} // namespace kelo::tool
