#include "files/section_cache.h"

#include <ctime>
#include <mutex>
#include <tuple>

#include "files/read_file.h"

namespace kelo::platform {
namespace {

struct Cache {
    std::mutex mutex;
    struct stat status {};
    std::shared_ptr<const SectionText> text;
};

// Never destroyed: static objects of a program may read section files until the very end.
Cache &TheCache() {
    static Cache *const cache = new Cache;
    return *cache;
}

bool IsSameFile(const struct stat &one, const struct stat &other) {
    const auto identity = [](const struct stat &s) {
        return std::tuple(s.st_dev, s.st_ino, s.st_size, s.st_mtim.tv_sec, s.st_mtim.tv_nsec,
                          s.st_ctim.tv_sec, s.st_ctim.tv_nsec);
    };
    return identity(one) == identity(other);
}

bool IsBefore(const timespec &one, const timespec &other) {
    return std::tuple(one.tv_sec, one.tv_nsec) < std::tuple(other.tv_sec, other.tv_nsec);
}

} // namespace

std::shared_ptr<const SectionText> LoadSectionText(const std::string &path) {
    // The clock that the kernel stamps files with.
    timespec start{};
    clock_gettime(CLOCK_REALTIME_COARSE, &start);
    struct stat status;
    const UniqueFd fd = OpenForReading(path, status);
    if (!fd)
        return nullptr;
    Cache &cache = TheCache();
    {
        const std::lock_guard lock(cache.mutex);
        if (cache.text != nullptr && IsSameFile(cache.status, status))
            return cache.text;
    }
    std::optional<std::string> content = ReadAll(fd.Get(), status.st_size);
    if (!content)
        return nullptr;
    auto text = std::make_shared<const SectionText>(std::move(*content));
    if (IsBefore(status.st_ctim, start)) {
        const std::lock_guard lock(cache.mutex);
        cache.status = status;
        cache.text = text;
    }
    return text;
}

} // namespace kelo::platform
