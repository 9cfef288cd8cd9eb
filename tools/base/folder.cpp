#include "base/folder.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <memory>

namespace kelo::tool {
namespace {

constexpr mode_t kFileMode = 0640;
constexpr int kFolderFlags = O_RDONLY | O_DIRECTORY | O_CLOEXEC;

} // namespace

Folder::Folder(int parent, const std::string &name, int flags)
    : folder_(openat(parent, name.c_str(), kFolderFlags | flags)), error_(folder_ ? 0 : errno) {}

Folder::Folder(const std::string &path) : Folder(AT_FDCWD, path, 0) {}

Folder::Folder(const Folder &parent, const std::string &name)
    : Folder(parent.folder_.Get(), name, O_NOFOLLOW) {
    if (!parent.folder_)
        error_ = parent.error_;
}

bool Folder::IsOpen() const {
    if (error_ != 0)
        errno = error_;
    return error_ == 0;
}

FileHandle Folder::Open(const std::string &name, int flags) const {
    if (!IsOpen())
        return FileHandle();
    return FileHandle(
        openat(folder_.Get(), name.c_str(), flags | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, kFileMode));
}

std::optional<std::string> Folder::Read(const std::string &name) const {
    const FileHandle file = Open(name, O_RDONLY);
    return file ? ReadWhole(file) : std::nullopt;
}

bool Folder::Write(const std::string &name, std::string_view content, const Folder &temporaries,
                   const std::string &temporary) const {
    const FileHandle file = temporaries.Open(temporary, O_WRONLY | O_CREAT | O_TRUNC);
    if (!file || !IsOpen())
        return false;
    if (WriteAll(file.Get(), content) && fsync(file.Get()) == 0 &&
        renameat(temporaries.folder_.Get(), temporary.c_str(), folder_.Get(), name.c_str()) == 0)
        return Sync();
    const int cause = errno;
    temporaries.Remove(temporary);
    errno = cause;
    return false;
}

bool Folder::Rename(const std::string &name, const Folder &to, const std::string &newName) const {
    // The new name first: between the two syncs the file may have both names, never none.
    return IsOpen() && to.IsOpen() &&
           renameat(folder_.Get(), name.c_str(), to.folder_.Get(), newName.c_str()) == 0 && to.Sync() &&
           Sync();
}

bool Folder::Remove(const std::string &name) const {
    return IsOpen() && unlinkat(folder_.Get(), name.c_str(), 0) == 0;
}

bool Folder::MakeFolder(const std::string &name, mode_t mode) const {
    return IsOpen() && mkdirat(folder_.Get(), name.c_str(), mode) == 0;
}

bool Folder::Sync() const {
    return IsOpen() && fsync(folder_.Get()) == 0;
}

std::optional<struct stat> Folder::Status(const std::string &name) const {
    struct stat status {};
    if (!IsOpen() || fstatat(folder_.Get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0)
        return std::nullopt;
    return status;
}

std::optional<std::vector<std::string>> Folder::Names() const {
    const int fd = IsOpen() ? openat(folder_.Get(), ".", kFolderFlags) : -1;
    DIR *opened = fd >= 0 ? fdopendir(fd) : nullptr;
    if (opened == nullptr)
        return std::nullopt;
    const std::unique_ptr<DIR, int (*)(DIR *)> closed(opened, closedir);
    std::vector<std::string> names;
    errno = 0;
    while (const dirent *entry = readdir(opened)) {
        names.emplace_back(entry->d_name);
        if (names.back() == "." || names.back() == "..")
            names.pop_back();
    }
    return errno == 0 ? std::optional(std::move(names)) : std::nullopt;
}

} // namespace kelo::tool
