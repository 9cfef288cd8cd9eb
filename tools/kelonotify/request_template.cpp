#include "kelonotify/request_template.h"

#include <algorithm>
#include <cctype>

#include "base/text_encoding.h"

namespace kelo::tool {
namespace {

std::string UrlEncoded(std::string_view value) {
    constexpr const char *kHex = "0123456789ABCDEF";
    std::string encoded;
    for (const char byte : value) {
        const auto code = static_cast<unsigned char>(byte);
        const bool isUnreserved = code < 0x80 && (std::isalnum(code) != 0 || byte == '-' || byte == '.' ||
                                                  byte == '_' || byte == '~');
        if (isUnreserved)
            encoded += byte;
        else
            encoded.append(1, '%').append(1, kHex[code >> 4]).append(1, kHex[code & 15]);
    }
    return encoded;
}

std::string Encoded(const std::string &value, Encoding encoding) {
    switch (encoding) {
    case Encoding::Url:
        return UrlEncoded(value);
    case Encoding::Xml:
        return EscapeMarkup(value, "&<>\"'");
    case Encoding::Json: {
        std::string text;
        AppendJsonString(text, value);
        return text.substr(1, text.size() - 2); // the template has the quotes
    }
    default:
        return value;
    }
}

} // namespace

std::optional<Encoding> EncodingOf(const std::string &contentType) {
    std::string type = contentType.substr(0, contentType.find(';'));
    type.erase(type.find_last_not_of(' ') + 1);
    std::transform(type.begin(), type.end(), type.begin(),
                   [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
    if (type == "application/x-www-form-urlencoded")
        return Encoding::Url;
    if (type == "application/json" || type.ends_with("+json"))
        return Encoding::Json;
    if (type.ends_with("/xml") || type.ends_with("+xml"))
        return Encoding::Xml;
    return type == "text/plain" ? std::optional(Encoding::None) : std::nullopt;
}

std::string FillRequest(std::string_view text, const TemplateWords &words, Encoding encoding) {
    std::string filled;
    while (!text.empty()) {
        const auto word = std::find_if(words.begin(), words.end(), [&](const auto &candidate) {
            return text.starts_with(candidate.first);
        });
        filled += word != words.end() ? Encoded(word->second, encoding) : std::string(1, text.front());
        text.remove_prefix(word != words.end() ? word->first.size() : 1);
    }
    return filled;
}

} // namespace kelo::tool
