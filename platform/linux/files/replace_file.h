#pragma once

#include <sys/stat.h>

#include <string>
#include <string_view>

#include "common/unique_fd.h"

namespace kelo::platform {

// Writes everything; false with errno set on failure.
bool WriteAll(int fd, std::string_view content);

// A file, locked for all who change it through this class. The lock ends with the object, or with the
// process. It is on `.NAME.lock` in the same folder, since a file that is replaced cannot carry it and a
// folder can be locked by everybody who may read it. The lock file stays; only who may write to the folder
// can open it.
class LockedFile {
public:
    // Waits up to 30 seconds. Check IsLocked; if it is not, errno says why (ETIMEDOUT).
    LockedFile(const std::string &folder, const std::string &name);

    bool IsLocked() const { return static_cast<bool>(lock_); }

    // Replaces or creates the file by a synced temporary file of a fixed name, so that
    // what a crash left is overwritten the next time. With `old` the new file gets its mode, owner and
    // group, else mode 0644 less the umask.
    //
    // True when the new content is on the disk; false with errno set, and then the file is the old one (or,
    // if only the folder's sync failed, perhaps the new one).
    bool Replace(std::string_view content, const struct stat *old);

private:
    std::string name_;
    UniqueFd fd_; // of the folder
    UniqueFd lock_;
};

} // namespace kelo::platform
