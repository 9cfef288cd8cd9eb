#pragma once

#include <sys/stat.h>

#include <string>
#include <string_view>

#include "common/unique_fd.h"

namespace kelo::platform {

// Writes everything; false with errno set on failure.
bool WriteAll(int fd, std::string_view content);

// An exclusive lock on a folder, for all who change its files through ReplaceFile. The lock ends with the
// object, or with the process. It is on the folder because a file that is replaced cannot carry it, and so
// that no lock file is left behind.
class LockedFolder {
public:
    // Waits up to 30 seconds. Check IsLocked; if it is not, errno says why (ETIMEDOUT).
    explicit LockedFolder(const std::string &path);

    bool IsLocked() const { return static_cast<bool>(fd_); }

    // Replaces or creates the file `name` in the folder by a synced temporary file of a fixed name, so that
    // what a crash left is overwritten the next time. With `old` the new file gets its mode, owner and
    // group, else mode 0644 less the umask.
    //
    // True when the new content is on the disk; false with errno set, and then the file is the old one (or,
    // if only the folder's sync failed, perhaps the new one).
    bool ReplaceFile(const std::string &name, std::string_view content, const struct stat *old);

private:
    UniqueFd fd_;
};

} // namespace kelo::platform
