#include "keepspool/spool_keeper.h"

#include <fcntl.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <sstream>

namespace kelo::tool {
namespace {

// syslog-ng closes a file after two seconds without a message; whoever has opened a file by its old name has
// written after this time.
constexpr int64_t kRestSec = 5;
constexpr const char *kAside = ".done-";

// Says how the file is read, so it stays.
std::string ExtensionOf(const std::string &name) {
    return std::filesystem::path(name).extension().string();
}

// Also when the clock was set back since.
bool IsLongAgo(int64_t time, int64_t now) {
    return std::llabs(now - time) >= kRestSec;
}

} // namespace

SpoolKeeper::SpoolKeeper(const std::string &folder, const std::string &doneFolder, Limits limits)
    : path_(folder), donePath_(doneFolder), limits_(limits) {}

bool SpoolKeeper::Prepare() {
    if (mkdir((path_ + "/files").c_str(), 0750) != 0 && errno != EEXIST)
        return false;
    const Folder folder(path_);
    return folder.Write("limit", std::to_string(limits_.bytes) + " " + std::to_string(limits_.spare) + "\n",
                        folder, "limit.new");
}

std::string SpoolKeeper::Step(int64_t now) {
    if (!isPrepared_ && !(isPrepared_ = Prepare()))
        return said_.empty() ? said_ = path_ + " cannot be used as message spool: " + std::strerror(errno)
                             : "";
    const Folder files(path_ + "/files");
    const Done done = ReadDone();
    uint64_t bytes = 0;
    for (const std::string &name : files.Names().value_or(std::vector<std::string>())) {
        const auto status = files.Status(name);
        if (!status || !S_ISREG(status->st_mode))
            continue;
        bytes += static_cast<uint64_t>(status->st_size);
        Sync(name, *status);
        Remove(name, *status, done, now);
    }
    std::string state = Judge(bytes);
    if (state == said_)
        return "";
    said_ = state;
    return state.empty() ? "the message spool in " + path_ + " has room again" : state;
}

void SpoolKeeper::Sync(const std::string &name, const struct stat &status) {
    off_t &size = synced_[status.st_ino];
    if (size == status.st_size)
        return;
    const FileHandle file = Folder(path_ + "/files").Open(name, O_RDONLY);
    if (file && fdatasync(file.Get()) == 0)
        size = status.st_size;
}

SpoolKeeper::Done SpoolKeeper::ReadDone() const {
    Done done;
    std::istringstream lines(Folder(donePath_).Read("spool-done").value_or(""));
    uint64_t inode = 0;
    uint64_t bytes = 0;
    for (std::string name; lines >> inode >> bytes >> name;)
        done[name] = {inode, bytes};
    return done;
}

// First the file gets a name that syslog-ng does not open, and later it is removed: who had found it by the
// old name has written to it by then, or has it open, and what was written is read.
void SpoolKeeper::Remove(const std::string &name, const struct stat &status, const Done &done, int64_t now) {
    const auto entry = done.find(name);
    const bool isDone = entry != done.end() && entry->second.first == status.st_ino &&
                        entry->second.second >= static_cast<uint64_t>(status.st_size);
    if (!isDone || !IsLongAgo(status.st_mtime, now) || !IsLongAgo(status.st_ctime, now) ||
        !IsUnused(name, status))
        return;
    const Folder files(path_ + "/files");
    if (name.starts_with(kAside))
        synced_.erase(files.Remove(name) ? status.st_ino : 0);
    else
        files.Rename(name, files, kAside + std::to_string(status.st_ino) + ExtensionOf(name));
}

// Whether no process can write the file: only then a lease for reading is given. Where the file system has no
// leases the time since the last change has to do.
bool SpoolKeeper::IsUnused(const std::string &name, const struct stat &status) const {
    const FileHandle file = Folder(path_ + "/files").Open(name, O_RDONLY);
    if (!file)
        return false;
    if (fcntl(file.Get(), F_SETLEASE, F_RDLCK) != 0)
        return errno == EINVAL || errno == ENOSYS || errno == EOPNOTSUPP;
    struct stat latest {};
    const bool isSame =
        fstat(file.Get(), &latest) == 0 && latest.st_ino == status.st_ino && latest.st_size == status.st_size;
    fcntl(file.Get(), F_SETLEASE, F_UNLCK);
    return isSame;
}

// Opens or closes the spool. Between the limits it stays as it is, so that it does not change every second.
std::string SpoolKeeper::Judge(uint64_t bytes) {
    struct statvfs volume {};
    if (statvfs(path_.c_str(), &volume) != 0)
        return path_ + ": " + std::strerror(errno);
    const uint64_t free = static_cast<uint64_t>(volume.f_bavail) * volume.f_frsize;
    if (bytes >= limits_.bytes || free < limits_.spare)
        isFull_ = true;
    else if (bytes <= limits_.bytes / 4 * 3 && free >= limits_.spare / 4 * 5)
        isFull_ = false;
    if (!SetOpen(!isFull_))
        return path_ + "/in: " + std::strerror(errno);
    return isFull_ ? "the message spool in " + path_ + " is full, and senders over TCP have to wait" : "";
}

bool SpoolKeeper::SetOpen(bool isOpen) const {
    const std::string link = path_ + "/in";
    if (isOpen)
        return symlink("files", link.c_str()) == 0 || errno == EEXIST;
    return unlink(link.c_str()) == 0 || errno == ENOENT;
}

} // namespace kelo::tool
