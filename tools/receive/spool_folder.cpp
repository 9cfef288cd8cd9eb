#include "receive/spool_folder.h"

#include <fcntl.h>
#include <sys/inotify.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <system_error>

namespace kelo::tool {

SpoolFolder::SpoolFolder(const std::string &path)
    : path_(path), folder_(path), changes_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    constexpr uint32_t kEvents = IN_CREATE | IN_MODIFY | IN_MOVED_TO | IN_DELETE;
    if (!changes_ || inotify_add_watch(changes_.Get(), path.c_str(), kEvents) < 0)
        throw std::system_error(errno, std::generic_category(), path);
}

bool SpoolFolder::Drain() const {
    alignas(inotify_event) char events[16 * 1024];
    bool areNames = false;
    for (ssize_t bytes = 0; (bytes = read(changes_.Get(), events, sizeof events)) > 0;) {
        for (const char *at = events; at < events + bytes;) {
            const auto *event = reinterpret_cast<const inotify_event *>(at);
            areNames = areNames || (event->mask & IN_MODIFY) == 0;
            at += sizeof(inotify_event) + event->len;
        }
    }
    return areNames;
}

void SpoolFolder::Refresh() {
    for (const auto &file : files_)
        file->Refresh();
}

SpoolFile *SpoolFolder::Find(ino_t inode) const {
    const auto found = std::find_if(files_.begin(), files_.end(),
                                    [inode](const auto &file) { return file->inode == inode; });
    return found != files_.end() ? found->get() : nullptr;
}

bool SpoolFolder::HasRoom() const {
    const auto isUnread = [](const auto &file) { return !file->isForeign && file->position < file->size; };
    return files_.size() < kMostOpen &&
           static_cast<size_t>(std::count_if(files_.begin(), files_.end(), isUnread)) < kMostUnread;
}

std::unique_ptr<SpoolFile> SpoolFolder::Open(const std::string &name) {
    FileHandle file = folder_.Open(name, O_RDONLY);
    struct stat status {};
    if (!file || fstat(file.Get(), &status) != 0) {
        if (errno != ENOENT)
            syslog(LOG_ERR, "cannot read %s/%s: %m", path_.c_str(), name.c_str());
        return nullptr;
    }
    return std::make_unique<SpoolFile>(std::move(file), status, name);
}

void SpoolFolder::Scan(const std::function<void(SpoolFile &)> &opened) {
    const std::optional<struct stat> own = folder_.Status(".");
    std::vector<std::string> names = folder_.Names().value_or(std::vector<std::string>());
    std::sort(names.begin(), names.end());
    Refresh();
    std::erase_if(files_, [](const auto &file) { return file->isRemoved && file->position >= file->size; });
    bytes_ = 0;
    unopened_ = 0;
    areAllOpen_ = true;
    for (const std::string &name : names) {
        const std::optional<struct stat> status = folder_.Status(name);
        if (!own || !status || !S_ISREG(status->st_mode))
            continue;
        if (status->st_uid != own->st_uid || (status->st_mode & (S_IWGRP | S_IWOTH)) != 0) {
            if (!areOthersTold_)
                syslog(LOG_ERR, "%s/%s is not read: others than its folder's owner can write it",
                       path_.c_str(), name.c_str());
            areOthersTold_ = true;
            continue;
        }
        bytes_ += static_cast<uint64_t>(status->st_size);
        if (SpoolFile *known = Find(status->st_ino)) {
            known->name = name;
        } else if (!HasRoom()) {
            areAllOpen_ = false;
            unopened_ += static_cast<uint64_t>(status->st_size);
        } else if (auto file = Open(name)) {
            opened(*file);
            files_.push_back(std::move(file));
        }
    }
    std::sort(files_.begin(), files_.end(),
              [](const auto &one, const auto &other) { return one->name < other->name; });
}

uint64_t SpoolFolder::Unread() const {
    uint64_t unread = unopened_;
    for (const auto &file : files_) {
        const uint64_t stored = file->Of(SpoolReader::kRows).offset;
        unread += file->size > stored ? file->size - stored : 0;
    }
    return unread;
}

} // namespace kelo::tool
