#include <cerrno>
#include <unordered_set>

#include "common/catch_bad_alloc.h"
#include "common/failure.h"
#include "files/refusal.h"
#include "files/section_cache.h"
#include "text/sz_hash.h"
#include "text/sz_list.h"

using namespace kelo::platform;

namespace {

int EnumSection(const std::string &path, TORVSZLIST &list) {
    const std::shared_ptr<const SectionText> text = LoadSectionText(path);
    if (text == nullptr)
        return -1;
    bool reported = false;
    std::unordered_set<std::string_view> seen;
    for (const SectionText::Section &section : text->Sections()) {
        if (section.name.empty() && !reported) {
            ReportRefusal(path, section.line, "not a section header, the section is passed over");
            reported = true; // once is enough for a file of garbage
        } else if (!section.name.empty() && seen.insert(section.name).second) {
            ListAppend(list, section.name);
        }
    }
    return 0;
}

int GetSection(const std::string &path, std::string_view name, TORVSZHASH &hash) {
    const std::shared_ptr<const SectionText> text = LoadSectionText(path);
    if (text == nullptr)
        return -1;
    const SectionText::Section *section = text->Find(name);
    if (section == nullptr)
        return FailWith(ENOENT);
    std::vector<SectionEntry> entries;
    if (const size_t line = text->Entries(*section, entries); line > 0) {
        ReportRefusal(path, line, "neither KEY=\"VALUE\" nor a comment");
        return FailWith(EBADMSG);
    }
    for (const SectionEntry &entry : entries)
        hash.Set(entry.key, entry.value);
    return 0;
}

} // namespace

int TORVCFileEnumSection(const char *path, TORVSZLIST **list) {
    if (path == nullptr || list == nullptr || *list == nullptr)
        return Recorded("TORVCFileEnumSection", path, FailWith(EINVAL));
    return Recorded("TORVCFileEnumSection", path,
                    CatchBadAlloc(-1, [&] { return EnumSection(path, **list); }));
}

int TORVCFileGetSection(const char *path, const char *section, TORVSZHASH **hash) {
    if (path == nullptr || section == nullptr || hash == nullptr || *hash == nullptr)
        return Recorded("TORVCFileGetSection", path, FailWith(EINVAL));
    return Recorded("TORVCFileGetSection", path,
                    CatchBadAlloc(-1, [&] { return GetSection(path, section, **hash); }));
}
