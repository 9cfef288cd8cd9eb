#include "base/atomic_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include "base/errors.h"

namespace kelo::tool {
namespace {

mode_t ModeOf(const std::string &target) {
    struct stat status {};
    if (stat(target.c_str(), &status) == 0)
        return status.st_mode & 0777;
    const mode_t mask = umask(0);
    umask(mask);
    return 0666 & ~mask;
}

// A rename lasts once the folder is on the disk. Where that cannot be told, the file is complete
// nevertheless.
void SyncFolderOf(const std::string &path) {
    const std::string folder = std::filesystem::absolute(path).parent_path().string();
    const int file = open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (file < 0)
        return;
    fsync(file);
    close(file);
}

} // namespace

AtomicFile::AtomicFile(const std::string &target) : target_(target), path_(target + ".XXXXXX") {
    struct stat status {};
    if (stat(target.c_str(), &status) == 0 && !S_ISREG(status.st_mode))
        Fail("it is no regular file");
    file_ = mkostemp(path_.data(), O_CLOEXEC);
    if (file_ < 0)
        Fail(std::strerror(errno));
}

AtomicFile::~AtomicFile() {
    close(file_);
    if (!path_.empty())
        unlink(path_.c_str());
}

void AtomicFile::Write(std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = write(file_, text.data(), text.size());
        if (written < 0 && errno != EINTR)
            Fail(std::strerror(errno));
        if (written > 0)
            text.remove_prefix(static_cast<size_t>(written));
    }
}

void AtomicFile::Commit() {
    if (fchmod(file_, ModeOf(target_)) != 0 || fsync(file_) != 0 ||
        std::rename(path_.c_str(), target_.c_str()) != 0)
        Fail(std::strerror(errno));
    path_.clear();
    SyncFolderOf(target_);
}

void AtomicFile::Fail(const std::string &reason) const {
    throw OutputError("cannot write " + target_ + ": " + reason);
}

} // namespace kelo::tool
