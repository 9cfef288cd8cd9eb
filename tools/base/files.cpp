#include "base/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>

namespace kelo::tool {
namespace {

constexpr off_t kMaxBytes = off_t{16} << 20;

} // namespace

FileHandle::~FileHandle() {
    if (fd_ >= 0)
        close(fd_);
}

std::optional<std::string> ReadWhole(const std::string &path) {
    const FileHandle file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    return file ? ReadWhole(file) : std::nullopt;
}

std::optional<std::string> ReadWhole(const FileHandle &file) {
    struct stat status;
    if (fstat(file.Get(), &status) != 0)
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

std::string FollowLinks(const std::string &path) {
    constexpr int kMostLinks = 40; // as the kernel
    std::filesystem::path file = std::filesystem::absolute(path);
    std::error_code error;
    for (int i = 0; i < kMostLinks && std::filesystem::is_symlink(file, error); ++i)
        file = file.parent_path() / std::filesystem::read_symlink(file, error);
    return file.string();
}

TemporaryFile::TemporaryFile(std::string pattern, std::string_view content)
    : path_(std::move(pattern)), file_(mkostemp(path_.data(), O_CLOEXEC)),
      isWritten_(file_ && WriteAll(file_.Get(), content)) {}

TemporaryFile::~TemporaryFile() {
    if (file_)
        unlink(path_.c_str());
}

} // namespace kelo::tool
