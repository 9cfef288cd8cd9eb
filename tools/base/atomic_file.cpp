#include "base/atomic_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

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

} // namespace

AtomicFile::AtomicFile(const std::string &target) : target_(target), path_(target + ".XXXXXX") {
    struct stat status {};
    if (stat(target.c_str(), &status) == 0 && !S_ISREG(status.st_mode))
        Fail("it is no regular file");
    file_ = FileHandle(mkostemp(path_.data(), O_CLOEXEC));
    if (!file_)
        Fail(std::strerror(errno));
}

AtomicFile::~AtomicFile() {
    if (!path_.empty())
        unlink(path_.c_str());
}

void AtomicFile::Write(std::string_view text) {
    if (!WriteAll(file_.Get(), text))
        Fail(std::strerror(errno));
}

void AtomicFile::Commit() {
    if (fchmod(file_.Get(), ModeOf(target_)) != 0 || fsync(file_.Get()) != 0 ||
        std::rename(path_.c_str(), target_.c_str()) != 0)
        Fail(std::strerror(errno));
    path_.clear();
    SyncFolderOf(target_); // if that fails, the file is complete nevertheless
}

void AtomicFile::Fail(const std::string &reason) const {
    throw OutputError("cannot write " + target_ + ": " + reason);
}

bool RenameToFreeName(const std::string &from, const std::string &to) {
    return renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), RENAME_NOREPLACE) == 0;
}

bool RemoveDurably(const std::string &path) {
    return (unlink(path.c_str()) == 0 || errno == ENOENT) && SyncFolderOf(path);
}

bool SyncFolderOf(const std::string &path) {
    const size_t slash = path.rfind('/');
    const std::string folder = slash == std::string::npos ? "." : path.substr(0, slash + 1);
    const FileHandle file(open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return file && fsync(file.Get()) == 0;
}

} // namespace kelo::tool
