#include "text/utf8.h"

namespace kelo::platform {
namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

// Length of the well-formed sequence (RFC 3629) at the start of `text`; 0 if there is none.
size_t SequenceLength(std::string_view text) {
    const auto byte = [&](size_t i) { return static_cast<unsigned char>(text[i]); };
    const unsigned char lead = byte(0);
    if (lead < 0x80)
        return 1;
    const size_t length = lead < 0xC2 ? 0 : lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : lead < 0xF5 ? 4 : 0;
    if (length == 0 || text.size() < length)
        return 0;
    // The second byte shows overlong forms, surrogates and values above U+10FFFF.
    const unsigned char low = lead == 0xE0 ? 0xA0 : lead == 0xF0 ? 0x90 : 0x80;
    const unsigned char high = lead == 0xED ? 0x9F : lead == 0xF4 ? 0x8F : 0xBF;
    if (byte(1) < low || byte(1) > high)
        return 0;
    for (size_t i = 2; i < length; ++i) {
        if ((byte(i) & 0xC0) != 0x80)
            return 0;
    }
    return length;
}

bool IsControl(char byte) {
    return static_cast<unsigned char>(byte) < 0x20 || byte == 0x7F;
}

void AppendHex(std::string &out, char byte) {
    constexpr std::string_view kDigits = "0123456789ABCDEF";
    const auto value = static_cast<unsigned char>(byte);
    out.append("\\x").append(1, kDigits[value >> 4]).append(1, kDigits[value & 15]);
}

} // namespace

std::string ToValidUtf8(std::string_view text) {
    std::string valid;
    valid.reserve(text.size());
    while (!text.empty()) {
        const size_t length = SequenceLength(text);
        valid += length > 0 ? text.substr(0, length) : kReplacement;
        text.remove_prefix(length > 0 ? length : 1);
    }
    return valid;
}

std::string ToPlainText(std::string_view text) {
    std::string plain;
    for (const char byte : ToValidUtf8(text)) {
        if (IsControl(byte) && byte != '\n' && byte != '\t')
            AppendHex(plain, byte);
        else
            plain += byte;
    }
    return plain;
}

std::string ToOneLine(std::string_view text, size_t maxBytes) {
    constexpr std::string_view kCut = "...";
    std::string line;
    for (const char byte : ToValidUtf8(text)) {
        if (byte == '\n' || byte == '\r' || byte == '\t')
            line += ' ';
        else if (IsControl(byte))
            AppendHex(line, byte);
        else
            line += byte;
    }
    if (line.size() <= maxBytes)
        return line;
    size_t end = maxBytes - kCut.size();
    while (end > 0 && (static_cast<unsigned char>(line[end]) & 0xC0) == 0x80)
        --end;
    return line.substr(0, end).append(kCut);
}

} // namespace kelo::platform
