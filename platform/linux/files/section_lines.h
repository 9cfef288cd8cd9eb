#pragma once

#include <string_view>

namespace kelo::platform {

enum class LineKind {
    kBlank,
    kComment,
    kHeader,       // `key` is the section's name
    kBrokenHeader, // begins with '[' but names no section
    kEntry,        // `key` and `value`
    kBroken,       // none of these
};

// One line of a section file. The views point into the text that was parsed.
struct SectionLine {
    LineKind kind = LineKind::kBlank;
    std::string_view text; // the whole line with its line feed
    std::string_view key;
    std::string_view value;
};

// Parses one line, with or without its line feed.
SectionLine ParseSectionLine(std::string_view text);

// Removes and returns the first line of `rest`, which is not empty.
SectionLine NextSectionLine(std::string_view &rest);

// Whether a header can have this name: not empty, no square bracket, line feed or NUL byte.
bool IsSectionName(std::string_view name);

} // namespace kelo::platform
