#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "files/section_text.h"

namespace kelo::platform {

// An entry as it is to stand in the file.
struct RenderedEntry {
    std::string_view key;
    std::string line; // with its line feed
};

// Whether `format` is one line with "%s" twice and no other '%', ended by its only line feed.
bool IsLineFormat(std::string_view format);

// Puts key and value into a line of `format` (see IsLineFormat). An empty text where the line would not be
// read back as exactly this key and value.
std::string RenderEntry(std::string_view format, std::string_view key, std::string_view value);

// The text with the first section `name` renamed to `newName` and given exactly these entries: lines are
// replaced where they stand, new ones follow the section's last entry, entries of other keys and broken lines
// of the section go. Comments, blank lines and everything else stay. A section that does not exist is
// appended.
std::string ReplaceSection(const SectionText &text, std::string_view name, std::string_view newName,
                           const std::vector<RenderedEntry> &entries);

// The text without this section of it: without what stands from its header to its last entry. What follows
// (comments that introduce the next section, as a rule) stays.
std::string RemoveSection(const SectionText &text, const SectionText::Section &section);

} // namespace kelo::platform
