#include "kelonotify/mime.h"

#include <algorithm>
#include <cstdio>
#include <ctime>

#include "base/text_encoding.h"

namespace kelo::tool {
namespace {

constexpr size_t kMaxLine = 76;
constexpr const char *kHex = "0123456789ABCDEF";

bool IsPlain(char byte) {
    return byte >= 0x20 && byte < 0x7f;
}

std::string Date(int64_t seconds) {
    constexpr const char *kDays[] = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
    constexpr const char *kMonths[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                       "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    const time_t time = static_cast<time_t>(seconds);
    tm parts{};
    if (gmtime_r(&time, &parts) == nullptr)
        parts = tm{};
    char text[64];
    std::snprintf(text, sizeof text, "%s, %02d %s %04d %02d:%02d:%02d +0000", kDays[parts.tm_wday],
                  parts.tm_mday, kMonths[parts.tm_mon], parts.tm_year + 1900, parts.tm_hour, parts.tm_min,
                  parts.tm_sec);
    return text;
}

} // namespace

std::string EncodeHeader(std::string_view text, size_t used) {
    const bool isPlain = std::all_of(text.begin(), text.end(), IsPlain);
    const bool hasBlankEnds = !text.empty() && (text.front() == ' ' || text.back() == ' ');
    if (isPlain && !hasBlankEnds && used + text.size() <= kMaxLine &&
        text.find("=?") == std::string_view::npos)
        return std::string(text);
    constexpr std::string_view kBegin = "=?UTF-8?B?";
    constexpr std::string_view kEnd = "?=";
    std::string words;
    while (!text.empty()) {
        const size_t room = kMaxLine - 1 - std::min<size_t>(used, 30) - kBegin.size() - kEnd.size();
        const size_t mostBytes = room / 4 * 3;
        const size_t whole = WholeCharacters(text, mostBytes);
        const size_t length = whole > 0 ? whole : mostBytes;
        words.append(words.empty() ? "" : "\r\n ")
            .append(kBegin)
            .append(Base64(text.substr(0, length)))
            .append(kEnd);
        text.remove_prefix(length);
    }
    return words;
}

std::string EncodeQuotedPrintable(std::string_view text) {
    std::string encoded;
    size_t column = 0;
    for (size_t i = 0; i < text.size(); ++i) {
        const char byte = text[i];
        if (byte == '\n') {
            encoded += "\r\n";
            column = 0;
            continue;
        }
        const bool endsLine = i + 1 == text.size() || text[i + 1] == '\n';
        // A soft line break may put any byte first on its line, where servers interpret a dot or "From" as
        // theirs.
        const bool isAtRisk = byte == '.' || byte == 'F';
        const bool isBlank = byte == ' ' || byte == '\t';
        const bool asItIs = isBlank ? !endsLine : IsPlain(byte) && byte != '=' && !(isAtRisk && column == 0);
        if (column + (asItIs ? 1 : 3) > kMaxLine - 1) {
            encoded += "=\r\n";
            column = 0;
            --i; // again, as the first of a line
            continue;
        }
        if (asItIs)
            encoded += byte;
        else
            encoded.append(1, '=')
                .append(1, kHex[static_cast<unsigned char>(byte) >> 4])
                .append(1, kHex[byte & 15]);
        column += asItIs ? 1 : 3;
    }
    return encoded;
}

std::string WriteMime(const Mail &mail) {
    constexpr std::string_view kSubject = "Subject: ";
    std::string text = "Date: " + Date(mail.time) + "\r\n";
    text += "From: <" + mail.sender + ">\r\n";
    text += "To: <" + mail.recipient + ">\r\n";
    text.append(kSubject).append(EncodeHeader(mail.subject, kSubject.size())).append("\r\n");
    text += "Message-ID: <" + mail.messageId + ">\r\n";
    text += "Auto-Submitted: auto-generated\r\n"
            "MIME-Version: 1.0\r\n"
            "Content-Type: text/plain; charset=utf-8\r\n"
            "Content-Transfer-Encoding: quoted-printable\r\n"
            "\r\n";
    return text + EncodeQuotedPrintable(mail.body);
}

} // namespace kelo::tool
