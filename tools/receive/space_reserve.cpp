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
constexpr ReserveFile kOfEvents{"/usr/kelo/etc/.reserve", 256 * 1024};
constexpr ReserveFile kOfSpool{"/var/spool/kelonotify/.reserve", 64 * 1024};

} // namespace

void SpaceReserve::Hold() const {
    for (const ReserveFile &reserve : {kOfEvents, kOfSpool}) {
        const std::string path = root_ + reserve.path;
        const FileHandle file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0640));
        if (file && posix_fallocate(file.Get(), 0, reserve.bytes) != 0)
            unlink(path.c_str());
    }
}

void SpaceReserve::ReleaseForEvent() const {
    unlink((root_ + kOfEvents.path).c_str());
}

void SpaceReserve::ReleaseForNotification() const {
    unlink((root_ + kOfSpool.path).c_str());
}

} // namespace kelo::tool
