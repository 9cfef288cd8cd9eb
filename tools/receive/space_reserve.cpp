#include "receive/space_reserve.h"

#include <fcntl.h>
#include <unistd.h>

#include "base/files.h"

namespace kelo::tool {
namespace {

struct ReserveFile {
    const char *path;
    off_t bytes;
};

// An event needs a write-ahead log and its index too.
constexpr ReserveFile kFiles[] = {{"/usr/kelo/etc/.reserve", 256 * 1024},
                                  {"/var/spool/kelonotify/.reserve", 64 * 1024}};

} // namespace

void SpaceReserve::Hold() const {
    for (const ReserveFile &reserve : kFiles) {
        const std::string path = root_ + reserve.path;
        const FileHandle file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0640));
        if (file && posix_fallocate(file.Get(), 0, reserve.bytes) != 0)
            unlink(path.c_str());
    }
}

void SpaceReserve::Release() const {
    for (const ReserveFile &reserve : kFiles)
        unlink((root_ + reserve.path).c_str());
}

} // namespace kelo::tool
