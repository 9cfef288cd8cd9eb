#include "status/server_status.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <ctime>

#include "base/errors.h"
#include "status/storage_folder.h"

namespace kelo::tool {
namespace {

constexpr int kDevices = 5;
constexpr int kEvents = 5;

DatabaseStatus *GoodDatabase(ServerStatus &status, const std::string &name) {
    for (DatabaseStatus &database : status.databases) {
        if (database.name == name && database.state == DatabaseStatus::State::Good)
            return &database;
    }
    return nullptr;
}

// Runs `read` on the database of this name if it is good, and records a failure in its status.
void WithDatabase(ServerStatus &status, const std::string &name, auto read) {
    DatabaseStatus *database = GoodDatabase(status, name);
    if (database == nullptr)
        return;
    try {
        read(database->path);
    } catch (const DatabaseError &error) {
        database->state = DatabaseStatus::State::Unreadable;
        database->problem = error.what();
    }
}

// Root opens no file that a service names.
bool MayOpenPathsOf(const ReceiverStatus &receiver) {
    struct stat file {};
    return geteuid() != 0 || (stat(receiver.path.c_str(), &file) == 0 && file.st_uid == 0);
}

} // namespace

ServerStatus GatherStatus(const StatusOptions &options) {
    ServerStatus status;
    status.time = std::time(nullptr);
    status.syslogNg = GatherSyslogNg(options.root, options.control, options.timeout);
    status.network = GatherNetwork(options.root, !options.control.empty(), status.syslogNg);
    status.receiver = GatherReceiver(options.root, status.time);
    status.messageSpool = GatherMessageSpool(options.root, status.network);
    status.folderProblems = FindFolderProblems(status.syslogNg, status.receiver);
    std::vector<std::string> others;
    if (!status.receiver.told.database.empty() && MayOpenPathsOf(status.receiver))
        others.push_back(status.receiver.told.database);
    status.databases = GatherDatabases(options.root, others);
    status.archives = GatherArchives(options.root);
    status.retention = GatherRetention(options.root);
    WithDatabase(status, "accounting",
                 [&](const std::string &path) { status.accounting = GatherAccounting(path, kDevices); });
    WithDatabase(status, "events",
                 [&](const std::string &path) { status.events = ReadRecentEvents(path, kEvents); });
    status.notifications = GatherNotifications(options.root);
    status.volumes = GatherVolumes(options.root);
    status.attention = FindAttention(status);
    return status;
}

} // namespace kelo::tool
