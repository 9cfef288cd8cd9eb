#include "archive/archive_folder.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <tuple>
#include <utility>

#include "archive/archive_name.h"
#include "base/atomic_file.h"
#include "base/errors.h"
#include "base/folder.h"
#include "base/sqlite.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

constexpr const char *kTemporary = ".kelosyslog-archive-";
constexpr const char *kRemoval = ".removing-";
constexpr const char *kLock = ".lock";
constexpr int kLockFlags = O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
constexpr mode_t kFolderMode = 0750;

} // namespace

ArchiveFolder::ArchiveFolder(std::string path, bool mayCreate) : path_(std::move(path)) {
    std::error_code error;
    if (mayCreate && !fs::exists(path_, error) && !error) {
        fs::create_directories(fs::path(path_).parent_path(), error);
        if (mkdir(path_.c_str(), kFolderMode) != 0 && errno != EEXIST)
            Fail(path_, errno);
    }
    lock_ = OpenLock();
    if (flock(lock_.Get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno == EWOULDBLOCK)
            throw OutputError(path_ + ": another run of kelosyslog archive works in this folder");
        Fail(path_, errno);
    }
    if (access(path_.c_str(), W_OK | X_OK) != 0)
        Fail(path_, errno);
    RemoveLeftovers();
}

// Whoever may read the folder can lock it, and the group adm may. So the lock is on a file in it that has no
// right to read: access lists give those rights that its mode has, too.
FileHandle ArchiveFolder::OpenLock() const {
    const std::string path = path_ + "/" + kLock;
    FileHandle made(open(path.c_str(), kLockFlags | O_CREAT | O_EXCL, S_IWUSR));
    struct stat status {};
    if (made && stat(path_.c_str(), &status) == 0) {
        // Where this fails the lock stays the owner's.
        std::ignore = fchown(made.Get(), static_cast<uid_t>(-1), status.st_gid);
        std::ignore = fchmod(made.Get(), S_IWUSR | (status.st_mode & (S_IWGRP | S_IWOTH)));
        return made;
    }
    FileHandle file(errno == EEXIST ? open(path.c_str(), kLockFlags) : -1);
    if (!file)
        Fail(path_, errno);
    return file;
}

ArchiveFolder::~ArchiveFolder() {
    try {
        RemoveLeftovers();
    } catch (const std::exception &) { // the next run removes them
    }
}

std::vector<std::string> ArchiveFolder::Names() const {
    std::error_code error;
    std::vector<std::string> names;
    for (auto entry = fs::directory_iterator(path_, error); entry != fs::directory_iterator();
         entry.increment(error))
        names.push_back(entry->path().filename().string());
    if (error)
        Fail(path_, error.value());
    return names;
}

// Temporary files, and notes whose archive never got its name or was removed.
void ArchiveFolder::RemoveLeftovers() const {
    for (const std::string &name : Names()) {
        const bool isNote = name.starts_with(kRemoval);
        if (name.starts_with(kTemporary) ||
            (isNote && access((path_ + "/" + name.substr(std::strlen(kRemoval))).c_str(), F_OK) != 0))
            unlink((path_ + "/" + name).c_str());
    }
}

std::string ArchiveFolder::NewTemporary() {
    std::string path = path_ + "/" + kTemporary + std::to_string(++temporaries_);
    if (!FileHandle(open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600)))
        Fail(path, errno);
    return path;
}

void ArchiveFolder::RemoveTemporary(const std::string &path) const {
    RemoveDatabase(path);
}

std::string ArchiveFolder::FreeName(const std::string &device, const std::string &firstDate,
                                    const std::string &lastDate) const {
    for (int number = 1;; ++number) {
        std::string name = ArchiveName(device, firstDate, lastDate, number);
        struct stat status {};
        if (lstat((path_ + "/" + name).c_str(), &status) == 0)
            continue;
        if (errno != ENOENT)
            Fail(path_ + "/" + name, errno);
        return name;
    }
}

std::string ArchiveFolder::Publish(const std::string &temporary, const std::string &name,
                                   const std::string &like) const {
    std::string path = path_ + "/" + name;
    const FileHandle file(open(temporary.c_str(), O_RDWR | O_NOFOLLOW | O_CLOEXEC));
    struct stat status {};
    if (!file || stat(like.c_str(), &status) != 0)
        Fail(path, errno);
    // Only root can give files away; for others the archive stays theirs, and their group's if it is the
    // same.
    const bool hasGroup = fchown(file.Get(), status.st_uid, status.st_gid) == 0 ||
                          fchown(file.Get(), static_cast<uid_t>(-1), status.st_gid) == 0;
    const mode_t mode = status.st_mode & (hasGroup ? 0666 : 0600);
    if (fchmod(file.Get(), mode) != 0 || fsync(file.Get()) != 0 || !RenameToFreeName(temporary, path))
        Fail(path, errno);
    if (!SyncFolderOf(path)) {
        const int error = errno;
        unlink(path.c_str());
        Fail(path, error);
    }
    return path;
}

void ArchiveFolder::NoteRemoval(const std::string &name, const std::string &source) const {
    const std::string note = path_ + "/" + kRemoval + name;
    const Folder folder(path_);
    if (!folder.Write(kRemoval + name, source, folder, std::string(kTemporary) + "note"))
        Fail(note, errno);
}

void ArchiveFolder::ForgetRemoval(const std::string &name) const {
    const std::string note = path_ + "/" + kRemoval + name;
    if (!RemoveDurably(note))
        Fail(note, errno);
}

std::vector<std::string> ArchiveFolder::PendingRemovals(const std::string &source) const {
    std::vector<std::string> archives;
    for (const std::string &name : Names()) {
        if (!name.starts_with(kRemoval))
            continue;
        const std::optional<std::string> content = ReadWhole(path_ + "/" + name);
        if (!content && errno == EACCES) // the next run would archive these records twice
            Fail(path_ + "/" + name, errno);
        if (content == source)
            archives.push_back(name.substr(std::strlen(kRemoval)));
    }
    return archives;
}

void ArchiveFolder::Fail(const std::string &path, int error) const {
    throw OutputError(path + ": " + std::strerror(error));
}

} // namespace kelo::tool
