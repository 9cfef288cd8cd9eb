#include "files/section_edit.h"

#include <unordered_map>

namespace kelo::platform {
namespace {

// The header with another name; blanks and a comment around the name stay.
std::string RenameHeader(const SectionLine &header, std::string_view newName) {
    const auto at = static_cast<size_t>(header.key.data() - header.text.data());
    std::string renamed(header.text);
    renamed.replace(at, header.key.size(), newName);
    return renamed;
}

std::string AppendSection(std::string_view content, std::string_view name,
                          const std::vector<RenderedEntry> &entries) {
    std::string edited(content);
    if (!edited.empty() && edited.back() != '\n')
        edited += '\n';
    if (!edited.empty() && !edited.ends_with("\n\n"))
        edited += '\n';
    edited.append("[").append(name).append("]\n");
    for (const RenderedEntry &entry : entries)
        edited += entry.line;
    return edited;
}

// The lines of one section with its entries replaced.
std::string EditSection(std::string_view section, std::string_view newName,
                        const std::vector<RenderedEntry> &entries) {
    std::unordered_map<std::string_view, const RenderedEntry *> unwritten;
    for (const RenderedEntry &entry : entries)
        unwritten.emplace(entry.key, &entry);

    std::string edited = RenameHeader(NextSectionLine(section), newName);
    if (edited.back() != '\n')
        edited += '\n';
    size_t end = edited.size(); // after the last entry so far
    while (!section.empty()) {
        const SectionLine line = NextSectionLine(section);
        if (line.kind == LineKind::kBlank || line.kind == LineKind::kComment) {
            edited += line.text;
            continue;
        }
        const auto found = unwritten.find(line.key);
        if (line.kind == LineKind::kEntry && found != unwritten.end()) {
            edited += found->second->line;
            unwritten.erase(found);
        }
        end = edited.size();
    }
    std::string added;
    for (const RenderedEntry &entry : entries) {
        if (unwritten.contains(entry.key))
            added += entry.line;
    }
    return edited.insert(end, added);
}

} // namespace

bool IsLineFormat(std::string_view format) {
    size_t placeholders = 0;
    for (size_t at = format.find('%'); at != std::string_view::npos; at = format.find('%', at + 2)) {
        if (!format.substr(at).starts_with("%s"))
            return false;
        ++placeholders;
    }
    return placeholders == 2 && format.find('\n') == format.size() - 1;
}

std::string RenderEntry(std::string_view format, std::string_view key, std::string_view value) {
    const size_t first = format.find("%s");
    const size_t second = format.find("%s", first + 2);
    std::string line(format.substr(0, first));
    line.append(key).append(format.substr(first + 2, second - first - 2));
    line.append(value).append(format.substr(second + 2));
    const SectionLine parsed = ParseSectionLine(line);
    const bool oneLine = line.find('\n') == line.size() - 1;
    if (!oneLine || parsed.kind != LineKind::kEntry || parsed.key != key || parsed.value != value)
        return "";
    return line;
}

std::string ReplaceSection(const SectionText &text, std::string_view name, std::string_view newName,
                           const std::vector<RenderedEntry> &entries) {
    const std::string_view content = text.Content();
    const SectionText::Section *section = text.Find(name);
    if (section == nullptr)
        return AppendSection(content, newName, entries);
    std::string edited(content.substr(0, section->begin));
    edited += EditSection(content.substr(section->begin, section->end - section->begin), newName, entries);
    edited += content.substr(section->end);
    return edited;
}

std::string RemoveSection(const SectionText &text, const SectionText::Section &section) {
    const std::string_view content = text.Content();
    std::string_view rest = content.substr(section.begin, section.end - section.begin);
    size_t end = section.begin;
    while (!rest.empty()) {
        const LineKind kind = NextSectionLine(rest).kind;
        if (kind != LineKind::kBlank && kind != LineKind::kComment)
            end = section.end - rest.size();
    }
    std::string edited(content.substr(0, section.begin));
    edited += content.substr(end);
    return edited;
}

} // namespace kelo::platform
