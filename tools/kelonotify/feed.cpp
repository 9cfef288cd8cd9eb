#include "kelonotify/feed.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "base/atomic_file.h"
#include "base/json.h"
#include "kelonotify/safe_text.h"

namespace kelo::tool {
namespace {

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
    const std::string path = folder_ + "/feed.jsonl";
    const std::string olderPath = folder_ + "/feed.1.jsonl";
    const std::optional<std::string> content = ReadWhole(path);
    if (!content && errno != ENOENT)
        return Added::No;
    const std::optional<std::string> older = ReadWhole(olderPath);
    if (!older && errno != ENOENT)
        return Added::No;
    const size_t whole = content ? content->rfind('\n') + 1 : 0; // 0 also without a line feed
    if ((content && Holds(content->substr(0, whole), entry.id)) || (older && Holds(*older, entry.id)))
        return Added::AlreadyThere;
    const bool isFull = whole > kMaxFeedBytes;
    if (isFull && !RenameDurably(path, olderPath))
        return Added::No;
    const FileHandle file(open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0640));
    const off_t end = isFull ? 0 : static_cast<off_t>(whole);
    const bool isWritten = file && ftruncate(file.Get(), end) == 0 &&
                           lseek(file.Get(), end, SEEK_SET) == end && WriteAll(file.Get(), Line(entry)) &&
                           fsync(file.Get()) == 0;
    return isWritten && SyncFolderOf(path) ? Added::Yes : Added::No;
}

} // namespace kelo::tool
