#include "reference/roff.h"

#include <cctype>
#include <string_view>

namespace kelo::tool {
namespace {

std::string Escaped(std::string_view text) {
    std::string roff;
    for (const char byte : text) {
        if (byte == '\\')
            roff += "\\e";
        else if (byte == '-')
            roff += "\\-";
        else if (byte == '\'')
            roff += "\\(aq";
        else
            roff += byte;
    }
    return roff;
}

bool IsWordByte(char byte) {
    return byte == '-' || byte == '_' || std::isalnum(static_cast<unsigned char>(byte)) != 0;
}

bool IsOption(std::string_view word) {
    const size_t name = word.find_first_not_of('-');
    return name != std::string_view::npos && name >= 1 && name <= 2 &&
           std::isalpha(static_cast<unsigned char>(word[name])) != 0;
}

} // namespace

std::string Roff(const std::string &text, const std::string &placeholder) {
    std::string roff = text.starts_with('.') ? "\\&" : "";
    for (size_t begin = 0; begin < text.size();) {
        size_t end = begin;
        while (end < text.size() && IsWordByte(text[end]) == IsWordByte(text[begin]))
            ++end;
        const std::string word = text.substr(begin, end - begin);
        roff += IsOption(word) ? RoffBold(word) : word == placeholder ? RoffItalic(word) : Escaped(word);
        begin = end;
    }
    return roff;
}

std::string RoffSentence(const std::string &text, const std::string &placeholder) {
    if (text.empty())
        return text;
    return Roff(text, placeholder) +
           (std::string_view(".:;!?").find(text.back()) == std::string_view::npos ? ".\n" : "\n");
}

std::string RoffBold(const std::string &text) {
    return "\\fB" + Escaped(text) + "\\fP";
}

std::string RoffItalic(const std::string &text) {
    return "\\fI" + Escaped(text) + "\\fP";
}

} // namespace kelo::tool
