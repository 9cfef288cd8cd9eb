#include "kelonotify/safe_text.h"

#include <algorithm>

#include "base/text_encoding.h"

namespace kelo::tool {
namespace {

std::string Cut(std::string text, size_t maxBytes) {
    constexpr std::string_view kCut = "...";
    if (text.size() <= maxBytes)
        return text;
    text.resize(WholeCharacters(text, maxBytes - kCut.size()));
    return text.append(kCut);
}

} // namespace

std::string SafeLine(std::string_view text, size_t maxBytes) {
    std::string folded(text);
    for (char &byte : folded) {
        if (byte == '\r' || byte == '\n' || byte == '\t')
            byte = ' ';
    }
    return Cut(EscapeForTerminal(folded), maxBytes);
}

std::string SafeLines(std::string_view text, size_t maxBytes) {
    std::string safe;
    for (size_t at = 0; at < text.size();) {
        const size_t end = std::min(text.find_first_of("\n\t", at), text.size());
        safe += EscapeForTerminal(text.substr(at, end - at));
        if (end < text.size())
            safe += text[end];
        at = end + 1;
    }
    return Cut(std::move(safe), maxBytes);
}

} // namespace kelo::tool
