#include "files/section_text.h"

#include <unordered_set>

namespace kelo::platform {
namespace {

constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

} // namespace

SectionText::SectionText(std::string content) : content_(std::move(content)) {
    std::string_view rest = content_;
    if (rest.starts_with(kByteOrderMark))
        rest.remove_prefix(kByteOrderMark.size());
    for (size_t number = 1; !rest.empty(); ++number) {
        const auto begin = static_cast<size_t>(rest.data() - content_.data());
        const SectionLine line = NextSectionLine(rest);
        if (line.kind != LineKind::kHeader && line.kind != LineKind::kBrokenHeader)
            continue;
        if (!sections_.empty())
            sections_.back().end = begin;
        if (!line.key.empty())
            byName_.emplace(line.key, sections_.size());
        sections_.push_back({line.key, begin, content_.size(), number});
    }
}

const SectionText::Section *SectionText::Find(std::string_view name) const {
    const auto found = byName_.find(name);
    return found != byName_.end() ? &sections_[found->second] : nullptr;
}

size_t SectionText::Entries(const Section &section, std::vector<SectionEntry> &entries) const {
    std::unordered_set<std::string_view> seen;
    std::string_view rest = Content().substr(section.begin, section.end - section.begin);
    for (size_t number = section.line; !rest.empty(); ++number) {
        const SectionLine line = NextSectionLine(rest);
        if (line.kind == LineKind::kBroken)
            return number;
        if (line.kind == LineKind::kEntry && seen.insert(line.key).second)
            entries.push_back({line.key, line.value});
    }
    return 0;
}

std::optional<std::string_view> SectionText::FindKey(std::string_view key) const {
    std::string_view rest = content_;
    if (rest.starts_with(kByteOrderMark))
        rest.remove_prefix(kByteOrderMark.size());
    while (!rest.empty()) {
        const SectionLine line = NextSectionLine(rest);
        if (line.kind == LineKind::kEntry && line.key == key)
            return line.value;
    }
    return std::nullopt;
}

} // namespace kelo::platform
