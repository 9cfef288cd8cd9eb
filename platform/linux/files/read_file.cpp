#include "files/read_file.h"

#include <fcntl.h>

#include <cerrno>

namespace kelo::platform {

UniqueFd OpenForReading(const std::string &path, struct stat &status) {
    UniqueFd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (!fd || fstat(fd.Get(), &status) != 0)
        return UniqueFd();
    if (S_ISREG(status.st_mode))
        return fd;
    errno = S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
    return UniqueFd();
}

std::optional<std::string> ReadAll(int fd, off_t sizeHint) {
    std::string content;
    size_t length = 0;
    // One byte more than expected, so that the end is seen without growing.
    size_t room = static_cast<size_t>(sizeHint < kMaxTextFileBytes ? sizeHint : kMaxTextFileBytes) + 1;
    for (;;) {
        content.resize(length + room);
        const ssize_t got = read(fd, content.data() + length, room);
        if (got < 0 && errno == EINTR)
            continue;
        if (got < 0)
            return std::nullopt;
        length += static_cast<size_t>(got);
        if (length > static_cast<size_t>(kMaxTextFileBytes)) {
            errno = EFBIG;
            return std::nullopt;
        }
        if (got == 0)
            break;
        room = content.size() > length ? content.size() - length : 4096;
    }
    content.resize(length);
    return content;
}

} // namespace kelo::platform
