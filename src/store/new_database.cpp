#include "store/new_database.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <iterator>
#include <string_view>

#include "common/db_handles.h"
#include "common/failure.h"
#include "db/creation.h"
#include "db/database_lock.h"
#include "store/log_tables.h"
#include "store/write_transaction.h"

namespace kelo {
namespace {

bool Exists(const std::string &path) {
    struct stat status {};
    return lstat(path.c_str(), &status) == 0;
}

// Whether a database that was moved has left something under the names of the missing one.
bool HasRemains(const std::string &dbPath) {
    const char *const files[] = {"-wal", "-shm", "-journal"};
    return std::any_of(std::begin(files), std::end(files),
                       [&](const char *file) { return Exists(dbPath + file); });
}

// Keeps the write-ahead log that a moved database has left, unless that has one under its own name: SQLite
// would delete it beside a new database. An empty one it would share with those who still use it, and the
// memory that guards it too.
void PutRemainsAside(const std::string &dbPath) {
    const std::string log = dbPath + "-wal";
    struct stat status {};
    if (stat(log.c_str(), &status) == 0 && status.st_size > 0)
        renameat2(AT_FDCWD, log.c_str(), AT_FDCWD, (dbPath + ".corrupt-wal").c_str(), RENAME_NOREPLACE);
    unlink(log.c_str());
    unlink((dbPath + "-shm").c_str());
}

enum class Removal { kAlways, kWhileEmpty };

// The file of a new database, which is removed at its end if it still has the name.
class NewFile {
public:
    NewFile(const std::string &file, Removal removal)
        : names_{file, file + "-journal", file + "-wal", file + "-shm"}, removal_(removal) {}
    ~NewFile() {
        if (isOurs_ && (removal_ == Removal::kAlways || IsEmptyFile(names_[0])))
            Remove();
    }
    NewFile(const NewFile &) = delete;
    NewFile &operator=(const NewFile &) = delete;

    // The platform opens only what exists. An empty file is a database without tables, and SQLite deletes the
    // journal that another one has left beside it.
    int Create(const std::string &dbPath) {
        const int fd = open(Name(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC,
                            S_IRUSR | S_IWUSR | S_IRGRP | S_IROTH);
        if (fd < 0)
            return FailWithErrno(dbPath, "create the database", errno);
        isOurs_ = true;
        close(fd);
        GiveToOwnerOfFolder(names_[0]);
        const DbConnection connection = ConnectOrFail(names_[0]);
        return connection != nullptr ? FillEmptyDatabase(connection.get(), dbPath) : -1;
    }
    // Allocates nothing.
    void Remove() const {
        for (const std::string &name : names_)
            unlink(name.c_str());
    }
    const char *Name() const { return names_[0].c_str(); }

private:
    const std::string names_[4];
    const Removal removal_;
    bool isOurs_ = false;
};

// Creates it under its name: only there SQLite does away with what a moved one has left. Somebody else may
// store something in it at once.
int CreateInPlace(const std::string &dbPath) {
    PutRemainsAside(dbPath);
    return NewFile(dbPath, Removal::kWhileEmpty).Create(dbPath);
}

void SyncFolderOf(const std::string &path) {
    const std::string folder = path.substr(0, path.rfind('/') + 1);
    const int fd = open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0)
        return;
    fsync(fd);
    close(fd);
}

} // namespace

int FillEmptyDatabase(DBConnect_tag *connection, const std::string &dbPath) {
    const std::string question = "SELECT 1 FROM sqlite_master LIMIT 1";
    DBResult_tag *raw = nullptr;
    if (KELODBExecute(connection, question.c_str(), &raw) < 0)
        return FailStatement(connection, dbPath, question);
    if (const DbResult result(raw); KELODBNumRows(result.get()) > 0)
        return 0;
    WriteTransaction transaction(connection, dbPath);
    if (transaction.Begin() != 0)
        return -1;
    // Each of them does nothing where somebody else was faster.
    for (std::string_view rest = kLogTables; rest.find(';') != std::string_view::npos;
         rest.remove_prefix(rest.find(';') + 1)) {
        if (RunStatement(connection, dbPath, std::string(rest.substr(0, rest.find(';')))) != 0)
            return -1;
    }
    // Write-ahead logging last: the file alone has all of it then.
    return transaction.Commit() == 0 ? RunStatement(connection, dbPath, "PRAGMA journal_mode=WAL") : -1;
}

int CreateLogDatabase(const std::string &dbPath) {
    if (access(dbPath.c_str(), F_OK) == 0 || errno != ENOENT)
        return 0;
    const DatabaseLock lock(dbPath);
    if (!lock.MayGoOn())
        return -1;
    if (Exists(dbPath))
        return 0;
    if (HasRemains(dbPath))
        return CreateInPlace(dbPath);
    NewFile file(dbPath + ".new-" + std::to_string(getpid()), Removal::kAlways);
    file.Remove(); // left by a killed process that had our number
    if (file.Create(dbPath) != 0)
        return -1;
    // Whoever was faster keeps the name: both files are alike.
    if (renameat2(AT_FDCWD, file.Name(), AT_FDCWD, dbPath.c_str(), RENAME_NOREPLACE) != 0 && errno != EEXIST)
        return FailWithErrno(dbPath, "rename the new database", errno);
    SyncFolderOf(dbPath);
    return 0;
}

} // namespace kelo
