#include "common/unique_fd.h"

#include <cerrno>

namespace kelo::platform {

UniqueFd::~UniqueFd() {
    if (fd_ < 0)
        return;
    const int savedErrno = errno;
    close(fd_);
    errno = savedErrno;
}

} // namespace kelo::platform
