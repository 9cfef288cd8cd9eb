#include <sqlite3.h>
#include <sys/stat.h>

#include <cerrno>

#include "common/failure.h"
#include "common/report.h"
#include "common/string_map.h"
#include "db/database_files.h"
#include "db/database_lock.h"
#include "keloplatform/kelodb.h"
#include "keloplatform/kelosystem.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/notification.h"

namespace {

// Whether there is a file of this name and, where there is a connection, it is that of the connection.
bool HasName(DBConnect_tag *connection, const std::string &dbPath) {
    struct stat named {};
    if (stat(dbPath.c_str(), &named) != 0)
        return false;
    sqlite3 *db = KELODBInternalDBHdlGet(connection);
    if (db == nullptr)
        return true;
    int hasMoved = 0;
    sqlite3_file_control(db, "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved);
    // SQLite knows the file by the name behind links, which may lead elsewhere by now.
    struct stat file {};
    return hasMoved == 0 && stat(sqlite3_db_filename(db, "main"), &file) == 0 &&
           file.st_dev == named.st_dev && file.st_ino == named.st_ino;
}

bool TellAdministrator(const std::string &dbPath) {
    NotificationManager notifications;
    kelo::SzHash placeholders;
    if (!placeholders) {
        kelo::FailPlatform(dbPath, "TORVCSzHashAlloc");
        return false;
    }
    placeholders.Set("%DBPATH%", dbPath);
    if (notifications.NotificationSend("KELOSYSLOG_DB_CORRUPT", placeholders.Address()) < 0) {
        kelo::ReportErrorAt("dbhandler", __LINE__, "Fail to send notification when db corruption");
        return false;
    }
    return true;
}

enum class Outcome { kMoved, kMovedBefore, kFailed };

// Sets `error` to errno if the rename failed.
Outcome PutAside(DBConnect_tag *connection, const std::string &dbPath, int &error) {
    const kelo::DatabaseLock lock(dbPath);
    if (!lock.MayGoOn())
        return Outcome::kFailed;
    // Whoever met the damage first has dealt with it, and what has the name now is sound.
    if (!HasName(connection, dbPath)) {
        if (connection == nullptr)
            kelo::FailWithErrno(dbPath, "stat", ENOENT);
        return connection != nullptr ? Outcome::kMovedBefore : Outcome::kFailed;
    }
    if (!TellAdministrator(dbPath))
        return Outcome::kFailed;
    error = kelo::PutDatabaseAside(dbPath, dbPath + ".corrupt");
    if (error == 0)
        return Outcome::kMoved;
    kelo::FailWithErrno(dbPath, "rename", error);
    return Outcome::kFailed;
}

} // namespace

int32_t DBErrorHandle_SQLITE_CORRUPT(DBConnect_tag *connection, std::string dbPath) {
    int error = errno;
    const Outcome outcome = PutAside(connection, dbPath, error);
    if (outcome != Outcome::kMoved) {
        errno = error;
        return outcome == Outcome::kMovedBefore ? 0 : -1;
    }
    if (!KELOSystemdReload("syslog-ng")) {
        kelo::FailPlatform("", "KELOSystemdReload");
        kelo::ReportErrorAt("dbhandler", __LINE__, "Fail to send HUP signal to syslog-ng");
        return -1;
    }
    return 0;
}
