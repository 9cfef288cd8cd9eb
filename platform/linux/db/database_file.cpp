#include "db/database_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <system_error>
#include <utility>

#include "keloplatform/vfs.h"

namespace kelo::platform {
namespace {

Database OpenNamed(const char *name, int flags) {
    sqlite3 *db = nullptr;
    const int status = sqlite3_open_v2(name, &db, flags, KELODBVfs());
    Database owner(db);
    if (status == SQLITE_OK)
        return owner;
    const int error = db != nullptr ? sqlite3_system_errno(db) : 0;
    owner.reset();
    errno = status == SQLITE_NOMEM || error == 0 ? ENOMEM : error;
    return nullptr;
}

// Whether SQLite cannot even read the file behind `db`: without its "-shm" it fails to open or to write that.
bool CannotRead(sqlite3 *db) {
    const int status = sqlite3_exec(db, "SELECT 1 FROM sqlite_schema LIMIT 1", nullptr, nullptr, nullptr);
    return status == SQLITE_CANTOPEN || status == SQLITE_READONLY;
}

// A "file:" URI of a path, whatever bytes it holds.
std::string UriOf(const std::string &path) {
    constexpr char kHex[] = "0123456789ABCDEF";
    std::string uri = "file:";
    for (const char byte : path) {
        const auto value = static_cast<unsigned char>(byte);
        uri.append({'%', kHex[value >> 4], kHex[value & 15]});
    }
    return uri;
}

} // namespace

DatabaseFile::DatabaseFile(const char *path) {
    std::error_code unresolved;
    path_ = std::filesystem::canonical(path, unresolved).string();
    unresolvedError_ = unresolved.value();
}

bool DatabaseFile::IsAtRestInReadOnlyFolder() const {
    const std::string folder = path_.substr(0, path_.rfind('/') + 1);
    if (faccessat(AT_FDCWD, folder.c_str(), W_OK, AT_EACCESS) == 0)
        return false;
    struct stat info;
    const bool hasRowsInWal = stat((path_ + "-wal").c_str(), &info) == 0 && info.st_size > 0;
    return !hasRowsInWal && stat((path_ + "-shm").c_str(), &info) != 0;
}

Database DatabaseFile::OpenWithoutLocks() {
    struct stat info;
    if (stat(path_.c_str(), &info) != 0)
        return nullptr;
    atRest_ = info;
    return OpenNamed((UriOf(path_) + "?immutable=1").c_str(),
                     SQLITE_OPEN_READONLY | SQLITE_OPEN_URI | SQLITE_OPEN_NOMUTEX);
}

Database DatabaseFile::Open() {
    struct stat info;
    if (path_.empty()) {
        errno = unresolvedError_;
        return nullptr;
    }
    if (stat(path_.c_str(), &info) != 0)
        return nullptr;
    if (!S_ISREG(info.st_mode)) {
        errno = S_ISDIR(info.st_mode) ? EISDIR : EINVAL;
        return nullptr;
    }
    // SQLite itself falls back to reading if it may not write.
    Database db = OpenNamed(path_.c_str(), SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX);
    if (db != nullptr && IsAtRestInReadOnlyFolder() && CannotRead(db.get()))
        return OpenWithoutLocks();
    return db;
}

bool DatabaseFile::HasChanged() const {
    if (!atRest_)
        return false;
    struct stat now;
    return stat(path_.c_str(), &now) != 0 || now.st_ino != atRest_->st_ino ||
           now.st_size != atRest_->st_size || now.st_mtim.tv_sec != atRest_->st_mtim.tv_sec ||
           now.st_mtim.tv_nsec != atRest_->st_mtim.tv_nsec;
}

} // namespace kelo::platform
