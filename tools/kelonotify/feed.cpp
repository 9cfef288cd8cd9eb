#include "kelonotify/feed.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "base/json.h"
#include "kelonotify/safe_text.h"

namespace kelo::tool {
namespace {

constexpr const char *kFeed = "feed.jsonl";
constexpr const char *kOlderFeed = "feed.1.jsonl";
constexpr size_t kMaxFeedBytes = size_t{1} << 20;
constexpr size_t kMaxTextBytes = size_t{16} << 10;

std::string Line(const Entry &entry) {
    Json::Value line;
    line["id"] = entry.id;
    line["time"] = static_cast<Json::Int64>(entry.time);
    line["tag"] = SafeLine(entry.tag, kMaxTextBytes);
    line["class"] = SafeLine(entry.className, kMaxTextBytes);
    line["title"] = SafeLine(entry.title, kMaxTextBytes);
    line["body"] = SafeLines(entry.body, kMaxTextBytes);
    return WriteJsonLine(line);
}

// A quote inside a text is escaped, so this occurs only in the line of the id.
bool Holds(const std::string &content, const std::string &id) {
    return content.find("\"id\":\"" + id + "\"") != std::string::npos;
}

} // namespace

Feed::Added Feed::Add(const Entry &entry) const {
    const Folder folder = spool_.Sub("desktop");
    const std::optional<std::string> content = folder.Read(kFeed);
    if (!content && errno != ENOENT)
        return Added::No;
    const std::optional<std::string> older = folder.Read(kOlderFeed);
    if (!older && errno != ENOENT)
        return Added::No;
    const size_t whole = content ? content->rfind('\n') + 1 : 0; // 0 also without a line feed
    if ((content && Holds(content->substr(0, whole), entry.id)) || (older && Holds(*older, entry.id)))
        return Added::AlreadyThere;
    const bool isFull = whole > kMaxFeedBytes;
    if (isFull && !folder.Rename(kFeed, folder, kOlderFeed))
        return Added::No;
    const FileHandle file = folder.Open(kFeed, O_WRONLY | O_CREAT);
    const off_t end = isFull ? 0 : static_cast<off_t>(whole);
    const bool isWritten = file && ftruncate(file.Get(), end) == 0 &&
                           lseek(file.Get(), end, SEEK_SET) == end && WriteAll(file.Get(), Line(entry)) &&
                           fsync(file.Get()) == 0;
    return isWritten && folder.Sync() ? Added::Yes : Added::No;
}

} // namespace kelo::tool
