#include "spool/spool.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

constexpr mode_t kFolderMode = 0750;
constexpr int64_t kTemporarySec = 24 * 3600;
constexpr const char *kRetryRequest = "retry";
constexpr const char *kReserve = ".reserve";

} // namespace

void Spool::Require(bool isDone, const std::string &name) const {
    if (!isDone)
        throw SpoolError(File(name) + ": " + std::strerror(errno));
}

Folder Spool::FolderOf(const std::string &name) const {
    const size_t slash = name.find('/');
    return slash == std::string::npos ? Folder(path_) : Sub(name.substr(0, slash));
}

std::vector<std::string> Spool::NamesIn(const std::string &folder) const {
    const std::optional<std::vector<std::string>> names = Sub(folder).Names();
    Require(names || errno == ENOENT, folder);
    return names.value_or(std::vector<std::string>());
}

std::optional<std::string> Spool::Read(const std::string &name) const {
    return FolderOf(name).Read(Leaf(name));
}

bool Spool::Exists(const std::string &name) const {
    return FolderOf(name).Status(Leaf(name)) || errno != ENOENT;
}

void Spool::Remove(const std::string &name) const {
    FolderOf(name).Remove(Leaf(name));
}

void Spool::Rename(const std::string &name, const std::string &newName) const {
    Require(FolderOf(name).Rename(Leaf(name), FolderOf(newName), Leaf(newName)), newName);
}

void Spool::CreateFolders() const {
    std::error_code error;
    fs::create_directories(fs::path(path_).parent_path(), error);
    Require(mkdir(path_.c_str(), kFolderMode) == 0 || errno == EEXIST, "");
    const Folder spool(path_);
    for (const char *name : {"tmp", "new", "state", "failed", "desktop"})
        Require(spool.MakeFolder(name, kFolderMode) || errno == EEXIST, name);
}

FileHandle Spool::Lock() const {
    FileHandle file = Folder(path_).Open("lock", O_RDWR | O_CREAT);
    Require(static_cast<bool>(file), "lock");
    if (flock(file.Get(), LOCK_EX | LOCK_NB) == 0)
        return file;
    Require(errno == EWOULDBLOCK, "lock");
    return FileHandle();
}

std::vector<std::string> Spool::Ids(const std::string &folder) const {
    std::vector<std::string> ids;
    for (const std::string &name : NamesIn(folder)) {
        const std::string id = name.substr(0, name.size() - std::min<size_t>(name.size(), 5));
        if (name == id + ".json" && IsEntryId(id))
            ids.push_back(id);
    }
    std::sort(ids.begin(), ids.end());
    return ids;
}

Entry Spool::ReadEntry(const std::string &name, const std::string &id) const {
    const std::optional<std::string> content = Read(name);
    if (!content && errno == ENOENT)
        throw EntryGone(File(name) + ": " + std::strerror(ENOENT));
    if (!content)
        throw std::runtime_error(File(name) + ": " + std::strerror(errno));
    return ParseEntry(*content, id);
}

Progress Spool::ReadRecord(const std::string &name) const {
    const std::optional<std::string> content = Read(name);
    Require(content || errno == ENOENT, name);
    try {
        return content ? ParseProgress(*content) : Progress();
    } catch (const std::runtime_error &) {
        return Progress(); // better delivered twice than not at all
    }
}

void Spool::Save(const std::string &name, const Progress &progress) const {
    const std::string temporary = Leaf(name) + "." + std::to_string(getpid());
    const auto write = [&] {
        return FolderOf(name).Write(Leaf(name), ToJson(progress), Sub("tmp"), temporary);
    };
    Require(write() || (errno == ENOSPC && Folder(path_).Remove(kReserve) && write()), name);
}

void Spool::SaveProgress(const std::string &id, const Progress &progress) const {
    Save("state/" + id + ".json", progress);
}

void Spool::Finish(const std::string &id) const {
    // In this order: a record without an entry is harmless, an entry without its record is sent again.
    const Folder entries = Sub("new");
    Require((entries.Remove(id + ".json") || errno == ENOENT) && entries.Sync(), "new/" + id + ".json");
    Remove("state/" + id + ".json");
}

void Spool::GiveUp(const std::string &id, const Progress &progress) const {
    Save("failed/" + id + ".state", progress);
    Rename("new/" + id + ".json", "failed/" + id + ".json");
    Remove("state/" + id + ".json");
}

bool Spool::Retry(const std::string &id, int64_t now) const {
    if (!IsEntryId(id) || !Exists("failed/" + id + ".json"))
        return false;
    Progress progress = ReadFailedProgress(id);
    std::erase_if(progress.targets, [](const auto &target) { return !target.second.isDone; });
    progress.since = now;
    progress.reason.clear();
    SaveProgress(id, progress);
    Rename("failed/" + id + ".json", "new/" + id + ".json");
    Remove("failed/" + id + ".state");
    return true;
}

void Spool::RequestRetry() const {
    Require(static_cast<bool>(Sub("new").Open(kRetryRequest, O_WRONLY | O_CREAT)), kRetryRequest);
}

bool Spool::TakeRetryRequest() const {
    return Sub("new").Remove(kRetryRequest);
}

void Spool::CleanUp(int64_t now) const {
    const Folder temporaries = Sub("tmp");
    for (const std::string &name : NamesIn("tmp")) {
        const std::optional<struct stat> status = temporaries.Status(name);
        if (status && status->st_mtime < now - kTemporarySec)
            temporaries.Remove(name);
    }
    // First `failed`, then `new`: an entry that is moved back is found in one of them.
    for (const std::string &id : Ids("state")) {
        if (!Exists("failed/" + id + ".json") && !Exists("new/" + id + ".json"))
            Remove("state/" + id + ".json");
    }
    for (const std::string &name : NamesIn("failed")) {
        const std::string id = name.substr(0, name.rfind('.'));
        if (name.ends_with(".state") && !Exists("failed/" + id + ".json"))
            Remove("failed/" + name);
    }
}

} // namespace kelo::tool
