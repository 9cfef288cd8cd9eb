#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace kelo::tool {

// A file descriptor that closes when it goes out of scope.
class FileHandle {
public:
    explicit FileHandle(int fd = -1) : fd_(fd) {}
    FileHandle(FileHandle &&other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
    FileHandle &operator=(FileHandle &&other) noexcept {
        std::swap(fd_, other.fd_);
        return *this;
    }
    ~FileHandle();

    int Get() const { return fd_; }
    explicit operator bool() const { return fd_ >= 0; }

private:
    int fd_;
};

// Each of these sets errno when it fails.

// The whole content of a regular file of up to 16 MiB; nothing on failure.
std::optional<std::string> ReadWhole(const std::string &path);

// Writes all of `content`.
bool WriteAll(int fd, std::string_view content);

// Writes a file that is there whole or not at all, also after a crash: as `temporary`, synced, renamed to
// `path`, whose folder is synced. Both paths are on one file system.
bool WriteFileAtomically(const std::string &temporary, const std::string &path, std::string_view content);

// Renames, and syncs the folders of both paths.
bool RenameDurably(const std::string &from, const std::string &to);

// Removes a file, and syncs its folder. One that is missing is removed.
bool RemoveDurably(const std::string &path);

} // namespace kelo::tool
