#include "files/replace_file.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <ctime>
#include <tuple>

namespace kelo::platform {
namespace {

constexpr int kLockPollMs = 10;
constexpr int kLockPolls = 30 * 1000 / kLockPollMs;

// Opens or makes the lock file, for those who may write to the folder: only who can open a file can lock it.
// Its mode has no right to read, so that an access list which lets others read the folder gives them nothing.
UniqueFd OpenLock(int folder, const std::string &name) {
    constexpr int kFlags = O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
    UniqueFd made(openat(folder, name.c_str(), kFlags | O_CREAT | O_EXCL, S_IWUSR));
    struct stat status;
    if (made && fstat(folder, &status) == 0) {
        // Where this fails the lock stays the owner's.
        std::ignore = fchown(made.Get(), static_cast<uid_t>(-1), status.st_gid);
        std::ignore = fchmod(made.Get(), S_IWUSR | (status.st_mode & (S_IWGRP | S_IWOTH)));
    }
    if (made || errno != EEXIST)
        return made;
    return UniqueFd(openat(folder, name.c_str(), kFlags));
}

bool WaitForLock(int fd) {
    const timespec pause{0, kLockPollMs * 1'000'000};
    for (int poll = 0; poll < kLockPolls; ++poll) {
        if (flock(fd, LOCK_EX | LOCK_NB) == 0)
            return true;
        if (errno != EWOULDBLOCK && errno != EINTR)
            return false;
        nanosleep(&pause, nullptr);
    }
    errno = ETIMEDOUT;
    return false;
}

bool WriteSynced(int fd, std::string_view content, const struct stat *old) {
    // The owner first: changing it clears mode bits.
    if (old != nullptr) {
        struct stat fresh;
        if (fstat(fd, &fresh) != 0)
            return false;
        const bool sameOwner = fresh.st_uid == old->st_uid && fresh.st_gid == old->st_gid;
        if ((!sameOwner && fchown(fd, old->st_uid, old->st_gid) != 0) ||
            fchmod(fd, old->st_mode & 07777) != 0)
            return false;
    }
    return WriteAll(fd, content) && fsync(fd) == 0;
}

} // namespace

bool WriteAll(int fd, std::string_view content) {
    while (!content.empty()) {
        const ssize_t written = write(fd, content.data(), content.size());
        if (written < 0 && errno != EINTR)
            return false;
        if (written > 0)
            content.remove_prefix(static_cast<size_t>(written));
    }
    return true;
}

LockedFile::LockedFile(const std::string &folder, const std::string &name)
    : name_(name), fd_(open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
    if (!fd_)
        return;
    lock_ = OpenLock(fd_.Get(), "." + name + ".lock");
    if (lock_ && !WaitForLock(lock_.Get()))
        lock_ = UniqueFd(); // keeps errno
}

bool LockedFile::Replace(std::string_view content, const struct stat *old) {
    const std::string temporary = "." + name_ + ".new";
    if (unlinkat(fd_.Get(), temporary.c_str(), 0) != 0 && errno != ENOENT)
        return false;
    const mode_t mode = old != nullptr ? 0600 : 0644;
    const UniqueFd file(openat(fd_.Get(), temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode));
    if (!file)
        return false;
    if (WriteSynced(file.Get(), content, old) &&
        renameat(fd_.Get(), temporary.c_str(), fd_.Get(), name_.c_str()) == 0)
        return fsync(fd_.Get()) == 0;
    const int cause = errno;
    unlinkat(fd_.Get(), temporary.c_str(), 0);
    errno = cause;
    return false;
}

} // namespace kelo::platform
