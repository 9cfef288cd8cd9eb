#include "files/section_lines.h"

namespace kelo::platform {
namespace {

constexpr std::string_view kBlanks = " \t\r\n";

std::string_view Trim(std::string_view text) {
    const size_t first = text.find_first_not_of(kBlanks);
    if (first == std::string_view::npos)
        return {};
    return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

bool IsComment(std::string_view trimmed) {
    return trimmed.front() == '#' || trimmed.front() == ';';
}

// A comment may follow the header on its line.
void ParseHeader(std::string_view trimmed, SectionLine &line) {
    line.kind = LineKind::kBrokenHeader;
    const size_t end = trimmed.find(']');
    if (end == std::string_view::npos)
        return;
    const std::string_view name = trimmed.substr(1, end - 1);
    const std::string_view rest = Trim(trimmed.substr(end + 1));
    if (!IsSectionName(name) || (!rest.empty() && !IsComment(rest)))
        return;
    line.kind = LineKind::kHeader;
    line.key = name;
}

// Quotes around the whole value are removed; inside them every character is literal, including a quote.
void ParseEntry(std::string_view trimmed, SectionLine &line) {
    line.kind = LineKind::kBroken;
    const size_t equals = trimmed.find('=');
    if (equals == std::string_view::npos || trimmed.find('\0') != std::string_view::npos)
        return;
    const std::string_view key = Trim(trimmed.substr(0, equals));
    std::string_view value = Trim(trimmed.substr(equals + 1));
    if (!value.empty() && value.front() == '"') {
        if (value.size() < 2 || value.back() != '"')
            return;
        value = value.substr(1, value.size() - 2);
    }
    if (key.empty())
        return;
    line.kind = LineKind::kEntry;
    line.key = key;
    line.value = value;
}

} // namespace

bool IsSectionName(std::string_view name) {
    return !name.empty() && name.find_first_of(std::string_view("[]\n\0", 4)) == std::string_view::npos;
}

SectionLine ParseSectionLine(std::string_view text) {
    SectionLine line;
    line.text = text;
    const std::string_view trimmed = Trim(text);
    if (trimmed.empty())
        line.kind = LineKind::kBlank;
    else if (IsComment(trimmed))
        line.kind = LineKind::kComment;
    else if (trimmed.front() == '[')
        ParseHeader(trimmed, line);
    else
        ParseEntry(trimmed, line);
    return line;
}

SectionLine NextSectionLine(std::string_view &rest) {
    const size_t feed = rest.find('\n');
    const size_t length = feed != std::string_view::npos ? feed + 1 : rest.size();
    const SectionLine line = ParseSectionLine(rest.substr(0, length));
    rest.remove_prefix(length);
    return line;
}

} // namespace kelo::platform
