#include "notify/spool.h"

#include <fcntl.h>
#include <json/json.h>
#include <sys/stat.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdio>

#include "common/root.h"
#include "common/unique_fd.h"
#include "common/utf8.h"
#include "files/replace_file.h"
#include "keloplatform/notify_hold.h"

namespace kelo::platform {
namespace {

constexpr mode_t kFolderMode = 0750;
constexpr mode_t kEntryMode = 0640; // log texts may be confidential

thread_local std::string heldId; // empty: nothing is held

// Sorts by time and is unique among all processes and calls.
std::string NewId(const timespec &now) {
    static std::atomic<unsigned> counter{0};
    char id[80];
    std::snprintf(id, sizeof id, "%012lld.%09ld-%ld-%u", static_cast<long long>(now.tv_sec), now.tv_nsec,
                  static_cast<long>(getpid()), counter++);
    return id;
}

std::string ToJson(const SpoolEntry &entry, const std::string &id, time_t now) {
    Json::Value root;
    root["version"] = 1;
    root["id"] = id;
    root["time"] = static_cast<Json::Int64>(now);
    root["tag"] = ToValidUtf8(entry.tag);
    root["language"] = ToValidUtf8(entry.language);
    root["channels"] = Json::arrayValue;
    for (const std::string_view channel : entry.channels)
        root["channels"].append(std::string(channel));
    root["title"] = entry.message.title;
    root["body"] = entry.message.body;
    root["class"] = "";
    root["values"] = Json::objectValue;
    for (const TORVSZHASH::Entry &value : entry.values->entries) {
        if (value.key == kClassKey)
            root["class"] = ToValidUtf8(value.value);
        else
            root["values"][ToValidUtf8(value.key)] = ToValidUtf8(value.value);
    }
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, root) + "\n";
}

UniqueFd OpenExisting(int parent, const std::string &name, int flags) {
    return UniqueFd(openat(parent, name.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC | flags));
}

// Opens a folder of the parent, creating it if it is missing. A created folder is synced into its parent, so
// that it survives a crash like its content.
UniqueFd OpenOrCreate(int parent, const std::string &name, int flags = 0) {
    UniqueFd folder = OpenExisting(parent, name, flags);
    if (folder || errno != ENOENT)
        return folder;
    // Another process may be quicker.
    if (mkdirat(parent, name.c_str(), kFolderMode) == 0 ? fsync(parent) != 0 : errno != EEXIST)
        return UniqueFd();
    return OpenExisting(parent, name, flags);
}

// Opens the folder at the absolute `path`, creating missing parents.
UniqueFd OpenFolder(const std::string &path) {
    UniqueFd folder = OpenExisting(AT_FDCWD, path, 0);
    if (folder || errno != ENOENT)
        return folder;
    folder = OpenExisting(AT_FDCWD, "/", 0);
    for (size_t at = path.find_first_not_of('/'); folder && at < path.size();) {
        const size_t end = std::min(path.find('/', at), path.size());
        folder = OpenOrCreate(folder.Get(), path.substr(at, end - at));
        at = path.find_first_not_of('/', end);
    }
    return folder;
}

} // namespace

std::string SpoolPath() {
    return RootedPath("/var/spool/kelonotify");
}

bool AddToSpool(const SpoolEntry &entry) {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    const bool isHeld = !heldId.empty();
    const std::string id = isHeld ? heldId : NewId(now);
    const std::string content = ToJson(entry, id, now.tv_sec);
    // The spool belongs to a service, which must not lead root elsewhere by a link.
    const UniqueFd spool = OpenFolder(SpoolPath());
    const UniqueFd tmp = spool ? OpenOrCreate(spool.Get(), "tmp", O_NOFOLLOW) : UniqueFd();
    const UniqueFd fresh = tmp ? OpenOrCreate(spool.Get(), isHeld ? "held" : "new", O_NOFOLLOW) : UniqueFd();
    if (!fresh)
        return false;

    const std::string name = id + ".json";
    if (isHeld)
        unlinkat(tmp.Get(), name.c_str(), 0); // of a call that was killed
    const int flags = O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC;
    const UniqueFd file(openat(tmp.Get(), name.c_str(), flags, kEntryMode));
    if (!file)
        return false;
    if (!WriteAll(file.Get(), content) || fsync(file.Get()) != 0 ||
        renameat(tmp.Get(), name.c_str(), fresh.Get(), name.c_str()) != 0) {
        const int cause = errno;
        unlinkat(tmp.Get(), name.c_str(), 0);
        errno = cause;
        return false;
    }
    if (fsync(fresh.Get()) == 0)
        return true;
    const int cause = errno;
    unlinkat(fresh.Get(), name.c_str(), 0);
    errno = cause;
    return false;
}

} // namespace kelo::platform

void KELONotifyHold(const char *id) {
    kelo::platform::heldId = id != nullptr ? id : "";
}

int KELONotifyRelease(const char *id) {
    using namespace kelo::platform;
    const std::string name = std::string(id) + ".json";
    const UniqueFd spool = OpenFolder(SpoolPath());
    const UniqueFd held = spool ? OpenOrCreate(spool.Get(), "held", O_NOFOLLOW) : UniqueFd();
    const UniqueFd fresh = held ? OpenOrCreate(spool.Get(), "new", O_NOFOLLOW) : UniqueFd();
    if (!fresh || (renameat(held.Get(), name.c_str(), fresh.Get(), name.c_str()) != 0 && errno != ENOENT))
        return -1;
    return fsync(fresh.Get()) == 0 ? 0 : -1;
}
