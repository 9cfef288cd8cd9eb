#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "files/section_text.h"

namespace kelo::platform {

// An entry to write into the file.
struct RenderedEntry {
    std::string_view key;
    std::string line; // with its line feed
};

// Whether `format` is one line with "%s" twice and no other '%', ended by its only line feed.
bool IsLineFormat(std::string_view format);

// Puts key and value into a line of `format` (see IsLineFormat). An empty text if the line would not be
// read back as exactly this key and value.
std::string RenderEntry(std::string_view format, std::string_view key, std::string_view value);

// The text with the first section `name` renamed to `newName` and given exactly these entries: lines are
// replaced in place, new ones follow the section's last entry, entries of other keys and invalid lines of the
// section are removed. Comments, blank lines and everything else stay. A section that does not exist is
// appended.
std::string ReplaceSection(const SectionText &text, std::string_view name, std::string_view newName,
                           const std::vector<RenderedEntry> &entries);

// The text without this section: without the lines from its header to its last entry. What follows (usually
// comments that introduce the next section) stays.
std::string RemoveSection(const SectionText &text, const SectionText::Section &section);

} // namespace kelo::platform
