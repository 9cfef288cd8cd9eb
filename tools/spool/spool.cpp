#include "spool/spool.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "base/atomic_file.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

constexpr int64_t kTemporarySec = 24 * 3600;
constexpr const char *kRetryRequest = "new/retry";

std::vector<std::string> NamesIn(const std::string &folder) {
    std::vector<std::string> names;
    std::error_code error;
    for (fs::directory_iterator at(folder, error), end; !error && at != end; at.increment(error))
        names.push_back(at->path().filename().string());
    if (error && error != std::errc::no_such_file_or_directory)
        throw SpoolError(folder + ": " + error.message());
    return names;
}

bool Exists(const std::string &path) {
    struct stat status;
    return lstat(path.c_str(), &status) == 0 || errno != ENOENT;
}

} // namespace

void Spool::Require(bool isDone, const std::string &name) const {
    if (!isDone)
        throw SpoolError(File(name) + ": " + std::strerror(errno));
}

void Spool::CreateFolders() const {
    std::error_code error;
    fs::create_directories(fs::path(path_).parent_path(), error);
    for (const char *name : {"", "tmp", "new", "state", "failed", "desktop"})
        Require(mkdir(File(name).c_str(), 0750) == 0 || errno == EEXIST, name);
}

FileHandle Spool::Lock() const {
    FileHandle file(open(File("lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0640));
    Require(static_cast<bool>(file), "lock");
    if (flock(file.Get(), LOCK_EX | LOCK_NB) == 0)
        return file;
    Require(errno == EWOULDBLOCK, "lock");
    return FileHandle();
}

std::vector<std::string> Spool::Ids(const std::string &folder) const {
    std::vector<std::string> ids;
    for (const std::string &name : NamesIn(File(folder))) {
        const std::string id = name.substr(0, name.size() - std::min<size_t>(name.size(), 5));
        if (name == id + ".json" && IsEntryId(id))
            ids.push_back(id);
    }
    std::sort(ids.begin(), ids.end());
    return ids;
}

Entry Spool::ReadEntry(const std::string &name, const std::string &id) const {
    const std::optional<std::string> content = ReadWhole(File(name));
    if (!content && errno == ENOENT)
        throw EntryGone(File(name) + ": " + std::strerror(ENOENT));
    if (!content)
        throw std::runtime_error(File(name) + ": " + std::strerror(errno));
    return ParseEntry(*content, id);
}

Progress Spool::ReadRecord(const std::string &name) const {
    const std::optional<std::string> content = ReadWhole(File(name));
    Require(content || errno == ENOENT, name);
    try {
        return content ? ParseProgress(*content) : Progress();
    } catch (const std::runtime_error &) {
        return Progress(); // better delivered twice than not at all
    }
}

void Spool::Save(const std::string &name, const Progress &progress) const {
    const std::string temporary = "tmp/" + name.substr(name.find('/') + 1) + "." + std::to_string(getpid());
    Require(WriteFileAtomically(File(temporary), File(name), ToJson(progress)), name);
}

void Spool::SaveProgress(const std::string &id, const Progress &progress) const {
    Save("state/" + id + ".json", progress);
}

void Spool::Finish(const std::string &id) const {
    // In this order: a record without an entry is harmless, an entry without its record is sent again.
    Require(RemoveDurably(File("new/" + id + ".json")), "new/" + id + ".json");
    unlink(File("state/" + id + ".json").c_str());
}

void Spool::GiveUp(const std::string &id, const Progress &progress) const {
    Save("failed/" + id + ".state", progress);
    Require(RenameDurably(File("new/" + id + ".json"), File("failed/" + id + ".json")), "failed");
    unlink(File("state/" + id + ".json").c_str());
}

bool Spool::Retry(const std::string &id, int64_t now) const {
    if (!IsEntryId(id) || !Exists(File("failed/" + id + ".json")))
        return false;
    Progress progress = ReadFailedProgress(id);
    std::erase_if(progress.targets, [](const auto &target) { return !target.second.isDone; });
    progress.since = now;
    progress.reason.clear();
    SaveProgress(id, progress);
    Require(RenameDurably(File("failed/" + id + ".json"), File("new/" + id + ".json")), "new");
    unlink(File("failed/" + id + ".state").c_str());
    return true;
}

void Spool::RequestRetry() const {
    const FileHandle file(
        open(File(kRetryRequest).c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0640));
    Require(static_cast<bool>(file), kRetryRequest);
}

bool Spool::TakeRetryRequest() const {
    return unlink(File(kRetryRequest).c_str()) == 0;
}

void Spool::CleanUp(int64_t now) const {
    for (const std::string &name : NamesIn(File("tmp"))) {
        struct stat status;
        if (lstat(File("tmp/" + name).c_str(), &status) == 0 && status.st_mtime < now - kTemporarySec)
            unlink(File("tmp/" + name).c_str());
    }
    // First `failed`, then `new`: an entry that is moved back is found in one of them.
    for (const std::string &id : Ids("state")) {
        if (!Exists(File("failed/" + id + ".json")) && !Exists(File("new/" + id + ".json")))
            unlink(File("state/" + id + ".json").c_str());
    }
    for (const std::string &name : NamesIn(File("failed"))) {
        const std::string id = name.substr(0, name.rfind('.'));
        if (name.ends_with(".state") && !Exists(File("failed/" + id + ".json")))
            unlink(File("failed/" + name).c_str());
    }
}

} // namespace kelo::tool
