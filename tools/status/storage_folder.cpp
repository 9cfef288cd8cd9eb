#include "status/storage_folder.h"

#include <pwd.h>
#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <optional>

#include "base/files.h"

namespace kelo::tool {
namespace {

constexpr mode_t kOthersWrite = S_IWGRP | S_IWOTH;

std::string FolderOf(const std::string &path) {
    return std::filesystem::path(path).parent_path().string();
}

std::string NameOf(uid_t user) {
    const passwd *entry = getpwuid(user);
    return entry != nullptr ? entry->pw_name : std::to_string(user);
}

std::optional<uid_t> UserOf(pid_t process) {
    struct stat status {};
    if (process <= 0 || stat(("/proc/" + std::to_string(process)).c_str(), &status) != 0)
        return std::nullopt;
    return status.st_uid;
}

// The database of a destination sql() on SQLite, whose instance is "sqlite3,HOST,PORT,PATH,TABLE".
std::string DatabaseOf(const SyslogNgCounters &destination) {
    constexpr std::string_view kStart = "sqlite3,,,";
    const std::string &instance = destination.instance;
    const size_t end = instance.rfind(',');
    if (destination.driver != "dst.sql" || !instance.starts_with(kStart) || end < kStart.size())
        return "";
    return instance.substr(kStart.size(), end - kStart.size());
}

// "" when nobody but the user can write the folder.
std::string WhoElseWrites(const std::string &folder, uid_t user) {
    struct stat status {};
    if (stat(folder.c_str(), &status) != 0)
        return "";
    if (status.st_uid != user && status.st_uid != 0)
        return "user " + NameOf(status.st_uid);
    return (status.st_mode & kOthersWrite) != 0 ? "a group or everybody" : "";
}

bool IsForeign(const std::string &folder, uid_t user) {
    struct stat status {};
    return user != 0 && stat(folder.c_str(), &status) == 0 && status.st_uid != user &&
           (status.st_mode & kOthersWrite) == 0;
}

} // namespace

std::vector<std::string> FindFolderProblems(const SyslogNgStatus &syslogNg, const ReceiverStatus &receiver) {
    std::vector<std::string> lines;
    for (const SyslogNgCounters &destination : syslogNg.destinations) {
        const std::string path = DatabaseOf(destination);
        if (path.empty())
            continue;
        // A link is as safe as the folder that holds it.
        for (const std::string &folder : {FolderOf(path), FolderOf(FollowLinks(path))}) {
            const std::string who = WhoElseWrites(folder, UserOf(syslogNg.pid).value_or(0));
            const std::string line =
                "syslog-ng stores into " + path + ", and " + who + " can write " + folder;
            if (!who.empty() && std::find(lines.begin(), lines.end(), line) == lines.end())
                lines.push_back(line);
        }
    }
    const std::string folder = FolderOf(receiver.told.database);
    const std::optional<uid_t> user = receiver.state == ReceiverStatus::State::Running
                                          ? UserOf(static_cast<pid_t>(receiver.told.pid))
                                          : std::nullopt;
    if (!receiver.told.database.empty() && user && IsForeign(folder, *user))
        lines.push_back("the receiver stores into " + receiver.told.database + ", and its user " +
                        NameOf(*user) + " cannot write " + folder);
    return lines;
}

} // namespace kelo::tool
