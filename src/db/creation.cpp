#include "db/creation.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <optional>
#include <tuple>
#include <vector>

#include "common/db_field.h"
#include "common/db_handles.h"
#include "common/failure.h"
#include "common/report.h"
#include "db/database_files.h"
#include "db/database_lock.h"
#include "db/first_row.h"
#include "db/shell.h"
#include "keloplatform/kelosystem.h"
#include "kelosyslog/debuger.h"

namespace kelo {
namespace {

bool Exists(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0;
}

bool IsDanglingLink(const std::string &path) {
    struct stat status {};
    return lstat(path.c_str(), &status) == 0 && S_ISLNK(status.st_mode) && !Exists(path);
}

// What the shell would not leave alone between double quotes, or what ends the command line.
bool IsSafeBetweenQuotes(const std::string &path) {
    return path.find_first_of(std::string("\"$`\\\n\0", 6)) == std::string::npos;
}

// Nothing must come into being where a name was mistyped.
bool IsAcceptable(const std::string &dbPath) {
    if (IsDanglingLink(dbPath)) {
        Fail(KELO_FAILURE_ARGUMENT, dbPath, "DBCreate", "it is a link to nothing");
        ReportError(dbPath + " is a link to nothing");
        return false;
    }
    if (IsSafeBetweenQuotes(dbPath))
        return true;
    Fail(KELO_FAILURE_ARGUMENT, dbPath, "DBCreate",
         "the path holds a character that a shell takes for its own");
    return false;
}

int ReportFailure(const std::string &dbPath, const std::string &schemaPath) {
    Debuger::MSG(0, "Fail to create database: " + dbPath + "," + schemaPath);
    return -1;
}

using Texts = std::vector<std::string>;

// What a file holds that is not empty. Of a damaged one nothing is known.
class Content {
public:
    explicit Content(const std::string &dbPath) : connection_(Connect(dbPath)) {}

    bool IsKnownToHoldNothing() const { return Column("SELECT name FROM sqlite_master", "name") == Texts{}; }

    // The row of db_info comes with the schema.
    bool IsKnownToHoldNoRecord() const {
        const auto tables = Column("SELECT replace(name, '\"', '\"\"') AS quoted FROM sqlite_master "
                                   "WHERE type = 'table' AND name <> 'db_info'",
                                   "quoted");
        return tables && std::all_of(tables->begin(), tables->end(), [this](const std::string &table) {
                   return Column("SELECT 1 AS found FROM \"" + table + "\" LIMIT 1", "found") == Texts{};
               });
    }

    bool IsKnownToLackWriteAheadLog() const {
        return Column("PRAGMA journal_mode", "journal_mode") == Texts{"delete"};
    }

private:
    // A column of all rows; nothing when the query fails.
    std::optional<Texts> Column(const std::string &sql, const char *column) const {
        DBResult_tag *raw = nullptr;
        if (connection_ == nullptr || KELODBExecute(connection_.get(), sql.c_str(), &raw) < 0)
            return std::nullopt;
        const DbResult result(raw);
        Texts values;
        for (uint32_t row = 0; FirstRow(result.get(), row);)
            values.emplace_back(FieldText(result.get(), row, column));
        return values;
    }

    DbConnection connection_;
};

std::string ToolFor(const std::string &dbPath) {
    return "/usr/bin/sqlite3 \"" + dbPath + "\" ";
}

void SetWriteAheadLog(const std::string &dbPath) {
    const std::string command = ToolFor(dbPath) + "\"PRAGMA journal_mode=WAL;\"";
    if (!RunShell(command))
        Debuger::MSG(0, "Fail to set jounal mode as WAL, use DELETE by default " + command);
}

// The sqlite3 tool writes its reason to the standard error; what lies outside of it is looked for here.
void FailForSchema(const std::string &dbPath, const std::string &schemaPath, const std::string &command) {
    const std::string folder = dbPath.substr(0, dbPath.rfind('/') + 1);
    struct statvfs space {};
    if (access(schemaPath.c_str(), R_OK) != 0)
        FailWithErrno(schemaPath, command, errno);
    else if (access(folder.c_str(), W_OK) != 0)
        FailWithErrno(folder, command, errno);
    else if (statvfs(folder.c_str(), &space) == 0 && space.f_bavail == 0)
        FailWithErrno(dbPath, command, ENOSPC);
    else
        Fail(KELO_FAILURE_OTHER, dbPath, command, "the sqlite3 tool cannot make it from the schema");
}

int RunSchema(const std::string &dbPath, const std::string &schemaPath) {
    const std::string command = ToolFor(dbPath) + "< " + schemaPath;
    if (!RunShell(command)) {
        FailForSchema(dbPath, schemaPath, command);
        return ReportFailure(dbPath, schemaPath);
    }
    syslog(LOG_INFO, "create database: %s by %s", dbPath.c_str(), schemaPath.c_str());
    SetWriteAheadLog(dbPath);
    return 0;
}

// Records are nothing that a creation has left: somebody else was faster.
void RemoveRemains(const std::string &dbPath) {
    // A table takes a page in addition to the first. A full disk has no room for looking into that.
    constexpr off_t kPageBytes = 4096;
    struct stat status {};
    if (lstat(dbPath.c_str(), &status) == 0 && S_ISREG(status.st_mode) &&
        (status.st_size <= kPageBytes || Content(dbPath).IsKnownToHoldNoRecord()))
        RemoveDatabase(dbPath);
}

int CreateMissing(const std::string &dbPath, const std::string &schemaPath) {
    const int result = RunSchema(dbPath, schemaPath);
    if (result == 0)
        GiveToOwnerOfFolder(dbPath);
    else
        RemoveRemains(dbPath);
    return result;
}

int CreateLocked(const DatabaseLock &lock, const std::string &dbPath, const std::string &schemaPath,
                 Creation when) {
    if (!Exists(dbPath) || IsEmptyFile(dbPath)) {
        // SQLite would join those who still use the one of a database that is gone.
        unlink((dbPath + "-shm").c_str());
        return CreateMissing(dbPath, schemaPath);
    }
    if (lock.IsInherited() && Content(dbPath).IsKnownToHoldNothing())
        return CreateMissing(dbPath, schemaPath);
    if (when == Creation::kAlways)
        return RunSchema(dbPath, schemaPath);
    if (lock.IsInherited() && Content(dbPath).IsKnownToLackWriteAheadLog())
        SetWriteAheadLog(dbPath);
    return 0;
}

} // namespace

bool IsEmptyFile(const std::string &path) {
    struct stat status {};
    return stat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode) && status.st_size == 0;
}

void GiveToOwnerOfFolder(const std::string &dbPath) {
    const std::string folder = dbPath.substr(0, dbPath.rfind('/') + 1);
    struct stat parent {};
    if (geteuid() != 0 || stat(folder.c_str(), &parent) != 0 || parent.st_uid == 0)
        return;
    // Closing a descriptor of another kind would release the locks of this process on the database.
    const int fd = open(dbPath.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC);
    struct stat file {};
    if (fd >= 0 && fstat(fd, &file) == 0 && S_ISREG(file.st_mode) && file.st_uid == 0 && file.st_nlink == 1)
        std::ignore = fchownat(fd, "", parent.st_uid, static_cast<gid_t>(-1), AT_EMPTY_PATH);
    if (fd >= 0)
        close(fd);
}

int CreateDatabase(const std::string &dbPath, const std::string &schemaPath, Creation when) {
    if (!IsAcceptable(dbPath))
        return ReportFailure(dbPath, schemaPath);
    const std::string folder = dbPath.substr(0, dbPath.rfind('/'));
    if (KELOFSMkdirP(folder.c_str(), 0, 1, -1, -1, 0777) < 0) {
        FailPlatform(folder, "KELOFSMkdirP");
        Debuger::MSG(0, "Fail to create folder: " + folder);
        return -1;
    }
    const DatabaseLock lock(dbPath);
    return lock.MayGoOn() ? CreateLocked(lock, dbPath, schemaPath, when) : ReportFailure(dbPath, schemaPath);
}

bool AwaitCreation(const std::string &dbPath, const std::string &schemaPath) {
    if (!DatabaseLock::IsThere(dbPath))
        return true;
    const DatabaseLock lock(dbPath);
    if (lock.IsInherited() && IsAcceptable(dbPath))
        CreateLocked(lock, dbPath, schemaPath, Creation::kIfMissing);
    return lock.MayGoOn();
}

} // namespace kelo
