#pragma once

#include <sys/stat.h>

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/files.h"

namespace kelo::tool {

// A folder by its descriptor. Nothing in it is reached through a link: whoever owns the folder cannot lead a
// process with more rights elsewhere.
//
// Names have no slash. What fails sets errno, also everything on a folder that could not be opened: then it
// is the reason of that.
class Folder {
public:
    // The path itself may be a link.
    explicit Folder(const std::string &path);
    Folder(const Folder &parent, const std::string &name);

    // The file, not waiting for the other end of a FIFO. A new one gets mode 0640.
    FileHandle Open(const std::string &name, int flags) const;

    // The whole content of a regular file of up to 16 MiB; nothing on failure.
    std::optional<std::string> Read(const std::string &name) const;

    // Writes a whole file: as `temporary` in `temporaries`, on the same file system, synced, and renamed.
    bool Write(const std::string &name, std::string_view content, const Folder &temporaries,
               const std::string &temporary) const;

    // Renames, over a file of that name, and makes both folders durable.
    bool Rename(const std::string &name, const Folder &to, const std::string &newName) const;

    // Removes a file.
    bool Remove(const std::string &name) const;

    bool MakeFolder(const std::string &name, mode_t mode) const;

    // Makes the names in the folder durable.
    bool Sync() const;

    // Of a link, its own.
    std::optional<struct stat> Status(const std::string &name) const;

    // All names but "." and ".."; nothing on failure.
    std::optional<std::vector<std::string>> Names() const;

private:
    Folder(int parent, const std::string &name, int flags);
    bool IsOpen() const;

    FileHandle folder_;
    int error_ = 0;
};

} // namespace kelo::tool
