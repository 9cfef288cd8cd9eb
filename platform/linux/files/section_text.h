#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "files/section_lines.h"

namespace kelo::platform {

struct SectionEntry {
    std::string_view key;
    std::string_view value;
};

// The content of a section file with an index of its headers. Views into it live as long as it does.
class SectionText {
public:
    struct Section {
        std::string_view name; // empty if the header is invalid
        size_t begin;          // offset of the header line
        size_t end;            // offset after the last line
        size_t line;           // number of the header line, from 1
    };

    explicit SectionText(std::string content);
    SectionText(const SectionText &) = delete;
    SectionText &operator=(const SectionText &) = delete;

    std::string_view Content() const { return content_; }
    // In file order, including all of the same name.
    const std::vector<Section> &Sections() const { return sections_; }
    // The first section of this name; null when there is none.
    const Section *Find(std::string_view name) const;

    // Appends the section's entries to `entries`, of each key only the first. Returns 0, or the number of the
    // first invalid line.
    size_t Entries(const Section &section, std::vector<SectionEntry> &entries) const;

    // The value of the first entry with this key in the whole text, in any section.
    std::optional<std::string_view> FindKey(std::string_view key) const;

private:
    std::string content_;
    std::vector<Section> sections_;
    std::unordered_map<std::string_view, size_t> byName_; // position in sections_
};

} // namespace kelo::platform
