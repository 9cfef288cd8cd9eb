#pragma once

#include <sys/stat.h>

#include <array>
#include <string>

namespace kelo::stress {

enum Database { kEvents, kAccounts, kLogs, kDatabases };

inline constexpr std::array<const char *, kDatabases> kDatabaseNames = {"events", "accounts", "logs"};

// Where everything is: the disk under test, which is the root of the library, and beside it what must
// survive.
struct Site {
    std::string folder;

    std::string Root() const { return folder + "/disk"; }
    std::string Ledgers() const { return folder + "/ledgers"; }
    // What was set aside or archived, moved away from the disk once no process had it open.
    std::string Attic() const { return folder + "/attic"; }
    std::string Archives() const { return Root() + "/var/log/kelosyslog/archive"; }
    std::string Copies() const { return Root() + "/copies"; }
    std::string Spool() const { return Root() + "/var/spool/kelonotify/new"; }
    // Each line is something that must not happen.
    std::string Complaints() const { return folder + "/complaints"; }
    // What the library reports to the system log, and the programs to their standard error.
    std::string Reports() const { return folder + "/reports"; }

    std::string PathOf(Database database) const {
        static constexpr std::array<const char *, kDatabases> kPaths = {
            "/usr/kelo/etc/kelosyslog.db", "/var/log/kelolog/.KELOACCOUNTDB", "/var/log/kelosyslog/logs.db"};
        return Root() + kPaths[database];
    }
};

// The inode of the file with this name; 0 for none.
inline ino_t InodeOf(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

} // namespace kelo::stress
