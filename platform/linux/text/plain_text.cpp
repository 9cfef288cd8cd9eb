#include "text/plain_text.h"

#include "common/utf8.h"

namespace kelo::platform {
namespace {

bool IsControl(char byte) {
    return static_cast<unsigned char>(byte) < 0x20 || byte == 0x7F;
}

void AppendHex(std::string &out, char byte) {
    constexpr std::string_view kDigits = "0123456789ABCDEF";
    const auto value = static_cast<unsigned char>(byte);
    out.append("\\x").append(1, kDigits[value >> 4]).append(1, kDigits[value & 15]);
}

} // namespace

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
