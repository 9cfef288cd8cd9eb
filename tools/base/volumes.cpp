#include "base/volumes.h"

#include <sys/stat.h>
#include <sys/statvfs.h>

#include <algorithm>
#include <filesystem>
#include <map>

namespace kelo::tool {
namespace {

constexpr const char *kFolders[] = {"/var/log/kelosyslog", "/var/log/kelosyslog/archive", "/var/log/kelolog",
                                    "/var/lib/syslog-ng",  "/var/spool/kelonotify",       "/usr/kelo/etc"};

// The folder, or the nearest existing one above it.
std::string ExistingFolder(const std::string &path, struct stat &status) {
    std::filesystem::path folder(path);
    while (stat(folder.c_str(), &status) != 0 && folder != folder.root_path())
        folder = folder.parent_path();
    return folder.string();
}

} // namespace

double VolumeStatus::FreePercent() const {
    return size > 0 ? 100 * static_cast<double>(free) / static_cast<double>(size) : 100;
}

VolumeStatus::Level VolumeStatus::FreeLevel() const {
    if (free < kFullBytes)
        return Level::Full;
    return FreePercent() < 10 ? Level::NearlyFull : Level::Good;
}

std::vector<VolumeStatus> GatherVolumes(const std::string &root, const std::string &folder) {
    std::vector<std::string> paths;
    for (const char *name : kFolders)
        paths.push_back(root + name);
    if (!folder.empty())
        paths.push_back(folder);
    std::vector<VolumeStatus> volumes;
    std::map<dev_t, size_t> known;
    for (const std::string &path : paths) {
        struct stat status {};
        struct statvfs space {};
        const std::string existing = ExistingFolder(path, status);
        if (statvfs(existing.c_str(), &space) != 0)
            continue;
        const auto [at, isNew] = known.emplace(status.st_dev, volumes.size());
        if (isNew) {
            // Space reserved for root counts as used, as in df(1).
            const uint64_t used = space.f_blocks - space.f_bfree;
            volumes.push_back(
                {{}, (used + space.f_bavail) * space.f_frsize, space.f_bavail * space.f_frsize});
        }
        std::vector<std::string> &folders = volumes[at->second].folders;
        if (std::find(folders.begin(), folders.end(), existing) == folders.end())
            folders.push_back(existing);
    }
    return volumes;
}

VolumeStatus VolumeOf(const std::string &root, const std::string &folder) {
    for (const VolumeStatus &volume : GatherVolumes(root, folder)) {
        if (std::find(volume.folders.begin(), volume.folders.end(), folder) != volume.folders.end())
            return volume;
    }
    return {{folder}, 0, 0};
}

} // namespace kelo::tool
