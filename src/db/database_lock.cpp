#include "db/database_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>
#include <utility>

#include "common/failure.h"
#include "common/report.h"

namespace kelo {
namespace {

using std::chrono::steady_clock;
constexpr std::chrono::seconds kPatience{30};
constexpr std::chrono::milliseconds kPause{1};

std::string LockPathOf(const std::string &dbPath) {
    return dbPath + ".lock";
}

// Never follows a link or waits for the other end of a FIFO.
int Open(const std::string &path) {
    return open(path.c_str(), O_WRONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
}

// Whether the name still is that of the open file.
bool HasName(int fd, const std::string &path) {
    struct stat file {};
    struct stat named {};
    return fstat(fd, &file) == 0 && lstat(path.c_str(), &named) == 0 && file.st_dev == named.st_dev &&
           file.st_ino == named.st_ino;
}

} // namespace

DatabaseLock::DatabaseLock(const std::string &dbPath) : path_(LockPathOf(dbPath)) {
    if (dbPath.empty()) {
        error_ = ENOENT;
        return;
    }
    const auto deadline = steady_clock::now() + kPatience;
    while (!Take() && error_ == EWOULDBLOCK && steady_clock::now() < deadline)
        std::this_thread::sleep_for(kPause);
}

DatabaseLock::~DatabaseLock() {
    if (fd_ < 0)
        return;
    unlink(path_.c_str());
    close(fd_);
}

// Tries once; EWOULDBLOCK means that it is worth trying again.
bool DatabaseLock::Take() {
    int fd = Open(path_);
    const bool wasThere = fd >= 0;
    if (fd < 0 && errno == ENOENT)
        fd = Make();
    if (fd < 0) {
        error_ = errno == EEXIST ? EWOULDBLOCK : errno;
        return false;
    }
    // Whoever released the lock meanwhile has removed the file: a lock on that excludes nobody.
    error_ = flock(fd, LOCK_EX | LOCK_NB) != 0 ? errno : HasName(fd, path_) ? 0 : EWOULDBLOCK;
    if (error_ != 0) {
        close(fd);
        return false;
    }
    isInherited_ = wasThere;
    fd_ = fd;
    return true;
}

// Makes the file, to be opened only by those who may write to its folder. Returns -1 with errno.
int DatabaseLock::Make() const {
    const size_t slash = path_.rfind('/');
    const std::string folder = slash == std::string::npos ? "." : path_.substr(0, slash + 1);
    const int fd = open(path_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IWUSR);
    struct stat status {};
    if (fd >= 0 && stat(folder.c_str(), &status) == 0) {
        // Where this fails only our own user can take the lock over.
        std::ignore = fchown(fd, static_cast<uid_t>(-1), status.st_gid);
        std::ignore = fchmod(fd, S_IWUSR | (status.st_mode & (S_IWGRP | S_IWOTH)));
    }
    return fd;
}

bool DatabaseLock::MayGoOn() const {
    switch (error_) {
    case 0:
    case EACCES:
    case ENOENT:
    case ENOTDIR:
    case EROFS:
        return true;
    default:
        FailWithErrno(path_, "lock the database", error_);
        ReportError("cannot lock " + path_ + ": " + std::strerror(error_));
        return false;
    }
}

bool DatabaseLock::IsThere(const std::string &dbPath) {
    return faccessat(AT_FDCWD, LockPathOf(dbPath).c_str(), F_OK, AT_SYMLINK_NOFOLLOW) == 0;
}

bool DatabaseLock::IsTaken(const std::string &dbPath) {
    const int fd = Open(LockPathOf(dbPath));
    if (fd < 0)
        return false;
    const bool isTaken = flock(fd, LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK;
    close(fd);
    return isTaken;
}

} // namespace kelo
