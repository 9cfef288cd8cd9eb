#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <new>
#include <string>

#include "common/failure.h"
#include "keloplatform/kelosystem.h"

namespace {

bool IsFolder(const std::string &path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0)
        return false;
    errno = ENOTDIR;
    return S_ISDIR(status.st_mode);
}

bool MakeFolder(const std::string &path, int uid, int gid, mode_t mode) {
    if (mkdir(path.c_str(), mode) != 0)
        return errno == EEXIST && IsFolder(path);
    return (uid < 0 && gid < 0) || chown(path.c_str(), static_cast<uid_t>(uid), static_cast<gid_t>(gid)) == 0;
}

int MakeFolders(const char *folder, int uid, int gid, mode_t mode) {
    if (folder == nullptr) {
        errno = EINVAL;
        return -1;
    }
    try {
        const std::string path = folder;
        // Every prefix that ends before a '/', then the whole path.
        for (size_t end = path.find('/', 1); !path.empty(); end = path.find('/', end + 1)) {
            if (!MakeFolder(path.substr(0, end), uid, gid, mode))
                return -1;
            if (end == std::string::npos)
                break;
        }
        return 0;
    } catch (const std::bad_alloc &) {
        errno = ENOMEM;
        return -1;
    }
}

} // namespace

int KELOFSMkdirP(const char *folder, int, int, int uid, int gid, unsigned int mode) {
    return kelo::platform::Recorded("KELOFSMkdirP", folder,
                                    MakeFolders(folder, uid, gid, static_cast<mode_t>(mode)));
}
