#include "attic.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <vector>

#include "base/files.h"

namespace kelo::stress {
namespace {

namespace fs = std::filesystem;

std::vector<std::string> NamesIn(const std::string &folder) {
    std::vector<std::string> names;
    if (!fs::exists(folder))
        return names;
    for (const auto &file : fs::directory_iterator(folder))
        names.push_back(file.path().filename());
    return names;
}

bool IsLocked(const std::string &path) {
    const tool::FileHandle file(open(path.c_str(), O_WRONLY | O_CLOEXEC));
    return file && flock(file.Get(), LOCK_EX | LOCK_NB) != 0;
}

// By a process that was killed before it moved the database itself: it still is the live one's too.
bool IsShared(const std::string &path) {
    std::error_code isMissing;
    const auto links = fs::hard_link_count(path, isMissing);
    return !isMissing && links > 1;
}

bool IsCompanion(const std::string &name) {
    return name.ends_with("-wal") || name.ends_with("-shm") || name.ends_with("-journal");
}

} // namespace

void Attic::Take(const std::function<bool(const std::string &)> &isOpen) {
    for (const Database database : {kEvents, kAccounts, kLogs})
        TakeSetAside(database, isOpen);
    TakeArchives(isOpen);
    TakeNotifications();
}

void Attic::TakeSetAside(Database database, const std::function<bool(const std::string &)> &isOpen) {
    const fs::path path = site_.PathOf(database);
    if (IsLocked(path.string() + ".lock")) // a move may be half done
        return;
    const std::string folder = path.parent_path();
    const std::string start = path.filename().string() + ".corrupt";
    const std::vector<std::string> names = NamesIn(folder);
    for (const std::string &name : names) {
        if (!name.starts_with(start) || IsCompanion(name))
            continue;
        const std::string files[] = {name, name + "-wal", name + "-shm", name + "-journal"};
        if (std::any_of(std::begin(files), std::end(files), [&](const std::string &file) {
                return isOpen(folder + "/" + file) || IsShared(folder + "/" + file);
            }))
            continue;
        const auto reason = isTorn_.find(InodeOf(folder + "/" + name));
        unexpected_ += reason == isTorn_.end() ? 1 : 0;
        const std::string target = std::to_string(++number_) + "-" + kDatabaseNames[database] +
                                   (reason != isTorn_.end() && reason->second ? ".torn" : "") + ".corrupt";
        for (const std::string &file : files)
            Move(folder + "/" + file, target + file.substr(name.size()));
        ++setAside_;
    }
}

void Attic::TakeArchives(const std::function<bool(const std::string &)> &isOpen) {
    for (const std::string &name : NamesIn(site_.Archives())) {
        const std::string path = site_.Archives() + "/" + name;
        // A note names the records that are still to be removed.
        if (name.ends_with(".db") && !name.starts_with(".") && !isOpen(path) &&
            !fs::exists(site_.Archives() + "/.removing-" + name))
            Move(path, std::to_string(++number_) + "-archive.db");
    }
}

void Attic::TakeNotifications() {
    for (const std::string &name : NamesIn(site_.Spool())) {
        ++notifications_;
        unlink((site_.Spool() + "/" + name).c_str());
    }
}

void Attic::Move(const std::string &path, const std::string &name) const {
    if (!fs::exists(path))
        return;
    fs::copy_file(path, site_.Attic() + "/" + name);
    unlink(path.c_str());
}

} // namespace kelo::stress
