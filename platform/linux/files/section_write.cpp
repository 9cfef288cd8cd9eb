#include <cerrno>
#include <climits>
#include <cstdlib>
#include <memory>

#include "common/catch_bad_alloc.h"
#include "common/failure.h"
#include "files/read_file.h"
#include "files/refusal.h"
#include "files/replace_file.h"
#include "files/section_edit.h"
#include "text/sz_hash.h"

using namespace kelo::platform;

namespace {

int Refuse(const std::string &path, int cause, const std::string &reason) {
    ReportRefusal(path, 0, reason);
    return FailWith(cause);
}

struct FreeString {
    void operator()(char *text) const { std::free(text); }
};

struct FilePlace {
    std::string folder;
    std::string name;
};

// The path of the file that a writer has to replace: behind all symbolic links. It need not exist yet, but a
// dangling link is refused, because the intended place of the file is unknown. False with errno set.
bool Locate(const std::string &path, FilePlace &place) {
    std::string real = path;
    if (const std::unique_ptr<char, FreeString> resolved(realpath(path.c_str(), nullptr)); resolved) {
        real = resolved.get();
    } else {
        struct stat status;
        if (errno != ENOENT)
            return false;
        if (lstat(path.c_str(), &status) == 0) {
            ReportRefusal(path, 0, "a symbolic link to nothing");
            return false;
        }
    }
    const size_t slash = real.rfind('/');
    place.folder = slash == std::string::npos ? "." : real.substr(0, slash + 1);
    place.name = slash == std::string::npos ? real : real.substr(slash + 1);
    if (!place.name.empty())
        return true;
    errno = EISDIR;
    return false;
}

// The change of a writer: `newName` is null to remove the section.
struct SectionChange {
    std::string_view name;
    const char *newName;
    std::vector<RenderedEntry> entries;
};

// Renders the hash; false with errno set after a report without the value, which may be a secret.
bool RenderEntries(const std::string &path, const TORVSZHASH &hash, std::string_view format,
                   std::vector<RenderedEntry> &entries) {
    for (const TORVSZHASH::Entry &entry : hash.entries) {
        entries.push_back({entry.key, RenderEntry(format, entry.key, entry.value)});
        if (entries.back().line.empty()) {
            errno = EINVAL;
            ReportRefusal(path, 0, "the value of " + entry.key + " cannot stand in a line of the file");
            return false;
        }
    }
    return true;
}

int Apply(const std::string &path, const SectionChange &change) {
    FilePlace place;
    if (!Locate(path, place))
        return -1;
    LockedFile file(place.folder, place.name);
    if (!file.IsLocked())
        return -1;

    struct stat old;
    std::optional<std::string> content;
    const UniqueFd fd = OpenForReading(place.folder + "/" + place.name, old);
    const bool exists = static_cast<bool>(fd);
    if (!exists && errno != ENOENT)
        return -1;
    content = exists ? ReadAll(fd.Get(), old.st_size) : std::string();
    if (!content)
        return -1;

    const SectionText text(std::move(*content));
    const SectionText::Section *section = text.Find(change.name);
    std::string edited;
    if (change.newName == nullptr) {
        if (section == nullptr)
            return FailWith(ENOENT);
        edited = RemoveSection(text, *section);
    } else {
        if (change.name != change.newName && text.Find(change.newName) != nullptr)
            return Refuse(path, EEXIST, "there is a section " + std::string(change.newName) + " already");
        edited = ReplaceSection(text, change.name, change.newName, change.entries);
    }
    return file.Replace(edited, exists ? &old : nullptr) ? 0 : -1;
}

} // namespace

int TORVCFileSetSection(const char *path, const char *section, const char *newName, TORVSZHASH *hash,
                        const char *lineFormat) {
    if (path == nullptr || section == nullptr)
        return Recorded("TORVCFileSetSection", path, FailWith(EINVAL));
    const auto set = [&] {
        SectionChange change{section, newName, {}};
        if (newName == nullptr)
            return Apply(path, change);
        if (hash == nullptr || lineFormat == nullptr || !IsLineFormat(lineFormat))
            return Refuse(path, EINVAL, "a section needs entries and a line format with \"%s\" twice");
        if (!IsSectionName(newName))
            return Refuse(path, EINVAL, "not a section name: \"" + std::string(newName) + "\"");
        if (!RenderEntries(path, *hash, lineFormat, change.entries))
            return -1;
        return Apply(path, change);
    };
    return Recorded("TORVCFileSetSection", path, CatchBadAlloc(-1, set));
}
