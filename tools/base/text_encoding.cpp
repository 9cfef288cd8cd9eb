#include "base/text_encoding.h"

#include <utf8.h>
#include <utf8/unchecked.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>

#include "base/byte_scan.h"

namespace kelo::tool {
namespace {

struct Character {
    uint32_t code;
    bool isValid; // else one byte that belongs to no UTF-8 sequence
};

// Takes the character at the front of what lies between `at` and `end`. Up to `checked` that is known to be
// UTF-8.
Character TakeCharacter(const char *&at, const char *end, const char *&checked) {
    const auto byte = static_cast<uint8_t>(*at);
    if (byte >= 0x80 && at >= checked)
        checked = utf8::find_invalid(at, end);
    if (byte >= 0x80 && at < checked)
        return {utf8::unchecked::next(at), true};
    ++at;
    return {byte, byte < 0x80};
}

// What most texts have none of: characters that are not ASCII or are not printed.
constexpr auto kIsNotAscii = [](auto bytes) { return bytes >= 0x80; };
constexpr auto kIsUnusual = [](auto bytes) { return (bytes < 0x20) | (bytes >= 0x7f); };
constexpr auto kIsUnusualInJson = [](auto bytes) {
    return (bytes < 0x20) | (bytes >= 0x7f) | (bytes == '"') | (bytes == '\\');
};
constexpr auto kIsSpecialInCsv = [](auto bytes) {
    return (bytes == ',') | (bytes == '"') | (bytes == '\r') | (bytes == '\n');
};

// Appends the text: the characters that `isPlain` accepts as they are, the rest as `escape` appends it.
// `isUnusual` is true for all bytes of the rest, and those that are not ASCII.
template <typename IsUnusual, typename IsPlain, typename Escape>
void AppendEscaped(std::string &out, std::string_view text, IsUnusual isUnusual, IsPlain isPlain,
                   Escape escape) {
    if (IsFreeOf(text, isUnusual)) {
        out += text;
        return;
    }
    const char *at = text.data();
    const char *const end = at + text.size();
    const char *plain = at; // where the plain characters before `at` begin
    const char *checked = at;
    while (at != end) {
        at = FindSpecial(at, end, isUnusual);
        if (at == end)
            break;
        const char *const start = at;
        const Character character = TakeCharacter(at, end, checked);
        if (character.isValid && isPlain(character.code))
            continue;
        out.append(plain, start);
        escape(character);
        plain = at;
    }
    out.append(plain, end);
}

bool IsControl(uint32_t code) {
    return code < 0x20 || (code >= 0x7f && code < 0xa0);
}

bool BeginsCharacter(char byte) {
    return (static_cast<uint8_t>(byte) & 0xc0) != 0x80;
}

bool TurnsDirection(uint32_t code) {
    return (code >= 0x202a && code <= 0x202e) || (code >= 0x2066 && code <= 0x2069);
}

// What JSON need not escape, but what shows a text other than it is or ends a line of JavaScript.
bool Misleads(uint32_t code) {
    const bool isMark = code == 0x061c || code == 0x200e || code == 0x200f;
    return isMark || code == 0x2028 || code == 0x2029 || TurnsDirection(code);
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

// A number with a sign is no formula.
bool IsFormula(std::string_view text) {
    if (text.empty() || std::string_view("=+-@\t\r\n").find(text.front()) == std::string_view::npos)
        return false;
    const std::string_view rest = text.substr(1);
    const bool isNumber = !rest.empty() && rest.find_first_not_of("0123456789.") == std::string_view::npos;
    return !isNumber || text.front() == '=' || text.front() == '@';
}

void AppendCsvField(std::string &out, std::string_view text) {
    if (IsFreeOf(text, kIsSpecialInCsv)) {
        out += text;
        return;
    }
    out += '"';
    for (size_t quote = 0; (quote = text.find('"')) != std::string_view::npos;) {
        out.append(text.substr(0, quote + 1)) += '"';
        text.remove_prefix(quote + 1);
    }
    out.append(text) += '"';
}

} // namespace

std::string EscapeForTerminal(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    const auto isPlain = [](uint32_t code) { return !IsControl(code) && !TurnsDirection(code); };
    AppendEscaped(out, text, kIsUnusual, isPlain, [&](Character character) {
        if (const char escape = ShortEscape(character.code); escape != 0)
            (out += '\\') += escape;
        else
            AppendEscape(out, character.isValid && character.code > 0x7f ? "\\u%04x" : "\\x%02x",
                         character.code);
    });
    return out;
}

size_t CharacterCount(std::string_view text) {
    return static_cast<size_t>(std::count_if(text.begin(), text.end(), BeginsCharacter));
}

size_t FirstCharacters(std::string_view text, size_t count) {
    size_t length = 0;
    while (length < text.size() && !(BeginsCharacter(text[length]) && count-- == 0))
        ++length;
    return length;
}

size_t WholeCharacters(std::string_view text, size_t maxBytes) {
    if (text.size() <= maxBytes)
        return text.size();
    constexpr size_t kLongest = 4;
    for (size_t length = maxBytes; maxBytes - length < kLongest; --length) {
        const auto byte = static_cast<uint8_t>(text[length]);
        if (BeginsCharacter(text[length])) {
            const size_t size = byte < 0xc0 ? 1 : byte < 0xe0 ? 2 : byte < 0xf0 ? 3 : kLongest;
            return length + size > maxBytes ? length : maxBytes;
        }
        if (length == 0)
            break;
    }
    return maxBytes;
}

bool AppendJsonString(std::string &out, std::string_view text) {
    bool isExact = true;
    const auto isPlain = [](uint32_t code) {
        return code != '"' && code != '\\' && !IsControl(code) && (code < 0x80 || !Misleads(code));
    };
    out += '"';
    AppendEscaped(out, text, kIsUnusualInJson, isPlain, [&](Character character) {
        isExact = isExact && character.isValid;
        if (!character.isValid)
            out += "\xef\xbf\xbd";
        else if (character.code == '"' || character.code == '\\')
            (out += '\\') += static_cast<char>(character.code);
        else if (const char escape = ShortEscape(character.code); escape != 0)
            (out += '\\') += escape;
        else
            AppendEscape(out, "\\u%04x", character.code);
    });
    out += '"';
    return isExact;
}

std::string Base64(std::string_view bytes) {
    constexpr const char *kDigits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    for (size_t i = 0; i < bytes.size(); i += 3) {
        const size_t count = std::min<size_t>(3, bytes.size() - i);
        uint32_t group = 0;
        for (size_t k = 0; k < 3; ++k)
            group = group << 8 | (k < count ? static_cast<unsigned char>(bytes[i + k]) : 0U);
        for (size_t k = 0; k < 4; ++k)
            text += k <= count ? kDigits[group >> (18 - 6 * k) & 63] : '=';
    }
    return text;
}

std::string EscapeMarkup(std::string_view text, std::string_view characters) {
    constexpr std::string_view kSpecials = "&<>\"'";
    constexpr const char *kEntities[] = {"&amp;", "&lt;", "&gt;", "&quot;", "&apos;"};
    std::string out;
    for (const char byte : text) {
        if (characters.find(byte) == std::string_view::npos)
            out += byte;
        else
            out += kEntities[kSpecials.find(byte)];
    }
    return out;
}

std::string EscapeDirections(std::string_view json) {
    std::string out;
    const auto isPlain = [](uint32_t code) { return !Misleads(code); };
    AppendEscaped(out, json, kIsNotAscii, isPlain, [&](Character character) {
        if (character.isValid)
            AppendEscape(out, "\\u%04x", character.code);
        else
            out += static_cast<char>(character.code);
    });
    return out;
}

void CsvLine::Add(std::string_view field) {
    if (!isFirst_)
        out_ += ',';
    isEmpty_ = isFirst_ && field.empty();
    isFirst_ = false;
    if (!style_.isForTerminal && !style_.isForSpreadsheet) {
        AppendCsvField(out_, field);
        return;
    }
    const std::string text = style_.isForTerminal ? EscapeForTerminal(field) : std::string(field);
    AppendCsvField(out_, style_.isForSpreadsheet && IsFormula(field) ? "'" + text : text);
}

void CsvLine::End() {
    if (isEmpty_)
        out_ += "\"\""; // an empty line would be no record to most readers
    out_ += "\r\n";
}

void AppendCsvLine(std::string &out, const std::vector<std::string> &fields, CsvStyle style) {
    CsvLine line(out, style);
    for (const std::string &field : fields)
        line.Add(field);
    line.End();
}

} // namespace kelo::tool
