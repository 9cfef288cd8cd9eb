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
std::optional<std::string> ReadWhole(const FileHandle &file);

// Writes all of `content`.
bool WriteAll(int fd, std::string_view content);

// The absolute path of the file that `path` leads to when its last component is a symbolic link, also where
// nothing is there yet. What moves or removes a database must do so to the file and leave the link.
std::string FollowLinks(const std::string &path);

// A file that only its owner can read and that is removed with the object.
class TemporaryFile {
public:
    // `pattern` is the path, ending in "XXXXXX", which is replaced to get a free name.
    TemporaryFile(std::string pattern, std::string_view content);
    ~TemporaryFile();
    TemporaryFile(const TemporaryFile &) = delete;
    TemporaryFile &operator=(const TemporaryFile &) = delete;

    bool IsWritten() const { return isWritten_; }
    const std::string &Path() const { return path_; }

private:
    std::string path_;
    FileHandle file_;
    bool isWritten_;
};

} // namespace kelo::tool
