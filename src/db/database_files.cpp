#include "db/database_files.h"

#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <iterator>

#include "common/db_handles.h"
#include "keloplatform/kelodb.h"

namespace kelo {
namespace {

// Of a database that is moved. A rollback journal is not among them: it is there only for the moment of a
// writer's transaction, which ends with its deletion by this name, and SQLite deletes one beside an empty
// file.
constexpr const char *kFiles[] = {"", "-wal", "-shm"};
// The platform's index for searches fits no other database, and a moved one does without.
constexpr const char *kSkipIndex = "-skip";

bool HasEntry(const std::string &path) {
    struct stat status {};
    return lstat(path.c_str(), &status) == 0;
}

bool IsSameFile(const std::string &one, const std::string &other) {
    struct stat status {};
    struct stat otherStatus {};
    return lstat(one.c_str(), &status) == 0 && lstat(other.c_str(), &otherStatus) == 0 &&
           status.st_dev == otherStatus.st_dev && status.st_ino == otherStatus.st_ino;
}

// A companion under a second name, before the database itself is moved: whoever creates the next database
// between two steps may delete or use what has the first name. Where there are no hard links it is renamed
// afterwards.
class CompanionMove {
public:
    CompanionMove(std::string from, std::string to) : from_(std::move(from)), to_(std::move(to)) {
        if (IsSameFile(from_, to_)) // by a process that was killed before it moved the database
            return;
        if (link(from_.c_str(), to_.c_str()) != 0)
            mustRename_ = errno != ENOENT;
    }
    void Finish() const {
        if (mustRename_)
            std::rename(from_.c_str(), to_.c_str());
        else if (IsSameFile(from_, to_))
            unlink(from_.c_str());
    }
    void TakeBack() const {
        if (IsSameFile(from_, to_))
            unlink(to_.c_str());
    }

private:
    std::string from_;
    std::string to_;
    bool mustRename_ = false;
};

// Keeps the companions from being deleted by the connection that closes last: it may have found the database
// under its name, and delete by theirs what belongs to the next one. It waits for one that does so now, and
// leaves the companions itself as they are.
class CompanionGuard {
public:
    explicit CompanionGuard(const std::string &dbPath) : connection_(Connect(dbPath)) {
        if (connection_ == nullptr)
            return;
        sqlite3_db_config(KELODBInternalDBHdlGet(connection_.get()), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1,
                          nullptr);
        KELODBExecute(connection_.get(), "PRAGMA user_version", nullptr);
    }

private:
    DbConnection connection_;
};

// Returns 0 or errno.
int MoveDatabase(const std::string &from, const std::string &to) {
    const CompanionMove companions[] = {{from + "-wal", to + "-wal"}, {from + "-shm", to + "-shm"}};
    const int error = std::rename(from.c_str(), to.c_str()) == 0 ? 0 : errno;
    for (const CompanionMove &companion : companions)
        error == 0 ? companion.Finish() : companion.TakeBack();
    if (error == 0)
        unlink((from + kSkipIndex).c_str());
    return error;
}

std::string WithFreeNumber(const std::string &path) {
    for (int number = 1;; ++number) {
        std::string numbered = path + "." + std::to_string(number);
        if (std::none_of(std::begin(kFiles), std::end(kFiles),
                         [&](const char *file) { return HasEntry(numbered + file); }))
            return numbered;
    }
}

// Renames what was put aside before. Returns false when that is not allowed, as it is somebody else's.
bool MakeRoom(const std::string &aside, const std::string &numbered, const std::string &dbPath) {
    return std::all_of(std::begin(kFiles), std::end(kFiles), [&](const char *file) {
        return IsSameFile(aside + file, dbPath + file) ||
               std::rename((aside + file).c_str(), (numbered + file).c_str()) == 0 || errno == ENOENT;
    });
}

} // namespace

int PutDatabaseAside(const std::string &dbPath, const std::string &aside) {
    if (!HasEntry(dbPath))
        return ENOENT;
    const CompanionGuard guard(dbPath);
    const std::string numbered = WithFreeNumber(aside);
    return MoveDatabase(dbPath, MakeRoom(aside, numbered, dbPath) ? aside : numbered);
}

void RemoveDatabase(const std::string &dbPath) {
    if (!HasEntry(dbPath))
        return;
    const CompanionGuard guard(dbPath);
    for (const char *suffix : {"", "-wal", "-shm", "-journal", kSkipIndex})
        unlink((dbPath + suffix).c_str());
}

} // namespace kelo
