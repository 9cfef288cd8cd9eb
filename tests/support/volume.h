#pragma once

#include <sys/mount.h>

#include <filesystem>
#include <string>

namespace kelo::test {

// A folder that is a file system of its own, in memory, while the object lives.
class Volume {
public:
    Volume(const std::string &folder, const std::string &size, unsigned long flags = 0) : folder_(folder) {
        std::filesystem::create_directories(folder);
        isMounted_ = mount("tmpfs", folder.c_str(), "tmpfs", flags, ("size=" + size).c_str()) == 0;
    }
    ~Volume() { umount(folder_.c_str()); }
    Volume(const Volume &) = delete;
    Volume &operator=(const Volume &) = delete;

    // Without the permission to mount it is not.
    bool IsMounted() const { return isMounted_; }

private:
    const std::string folder_;
    bool isMounted_;
};

} // namespace kelo::test
