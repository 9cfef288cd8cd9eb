#include "base/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

namespace kelo::tool {
namespace {

constexpr off_t kMaxBytes = off_t{16} << 20;

bool SyncFolderOf(const std::string &path) {
    const FileHandle folder(
        open(path.substr(0, path.rfind('/') + 1).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return folder && fsync(folder.Get()) == 0;
}

} // namespace

FileHandle::~FileHandle() {
    if (fd_ >= 0)
        close(fd_);
}

std::optional<std::string> ReadWhole(const std::string &path) {
    const FileHandle file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    struct stat status;
    if (!file || fstat(file.Get(), &status) != 0)
        return std::nullopt;
    if (!S_ISREG(status.st_mode) || status.st_size > kMaxBytes) {
        errno = S_ISREG(status.st_mode) ? EFBIG : EINVAL;
        return std::nullopt;
    }
    std::string content(static_cast<size_t>(status.st_size), '\0');
    size_t filled = 0;
    while (filled < content.size()) {
        const ssize_t count = read(file.Get(), content.data() + filled, content.size() - filled);
        if (count < 0 && errno == EINTR)
            continue;
        if (count < 0)
            return std::nullopt;
        if (count == 0)
            break;
        filled += static_cast<size_t>(count);
    }
    content.resize(filled);
    return content;
}

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

bool WriteFileAtomically(const std::string &temporary, const std::string &path, std::string_view content) {
    const int flags = O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOFOLLOW;
    const FileHandle file(open(temporary.c_str(), flags, 0640));
    if (file && WriteAll(file.Get(), content) && fsync(file.Get()) == 0 &&
        std::rename(temporary.c_str(), path.c_str()) == 0)
        return SyncFolderOf(path);
    const int cause = errno;
    unlink(temporary.c_str());
    errno = cause;
    return false;
}

bool RenameDurably(const std::string &from, const std::string &to) {
    // The new name first: between the two syncs the file may have both names, never none.
    return std::rename(from.c_str(), to.c_str()) == 0 && SyncFolderOf(to) && SyncFolderOf(from);
}

bool RemoveDurably(const std::string &path) {
    return (unlink(path.c_str()) == 0 || errno == ENOENT) && SyncFolderOf(path);
}

} // namespace kelo::tool
