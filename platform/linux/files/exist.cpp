#include <cerrno>

#include <sys/stat.h>

#include "keloplatform/torvc.h"

bool TORVCFileExist(const char *path) {
    if (path == nullptr) {
        errno = EINVAL;
        return false;
    }
    struct stat status;
    return stat(path, &status) == 0;
}
