#pragma once

#include <sqlite3.h>
#include <sys/stat.h>

#include <memory>
#include <optional>
#include <string>

namespace kelo::platform {

struct CloseDatabase {
    void operator()(sqlite3 *db) const { sqlite3_close(db); }
};
using Database = std::unique_ptr<sqlite3, CloseDatabase>;

// The file behind a connection, and how SQLite has to open it.
class DatabaseFile {
public:
    // Throws std::bad_alloc.
    explicit DatabaseFile(const char *path);

    // Opens the existing file: for writing, else for reading. Null, with errno, when that is impossible, or
    // when the path is not a regular file (opening a FIFO would wait for its other end forever).
    //
    // A database in WAL mode needs its "-shm" file, which a reader without write permission in the folder
    // cannot create. If no "-wal" file has rows either, the database is not open anywhere and the main file
    // is complete: it is then read without locks, and HasChanged() says whether the file has changed since.
    Database Open();

    // True when the file is read without locks and has been written since.
    bool HasChanged() const;

private:
    bool IsAtRestInReadOnlyFolder() const;
    Database OpenWithoutLocks();

    // Absolute, as SQLite resolves it to name the companion files; so "file:x" and ":memory:" are only names.
    // Empty if there is no such file.
    std::string path_;
    int unresolvedError_ = 0;           // why there is no path
    std::optional<struct stat> atRest_; // set when the file is read without locks
};

} // namespace kelo::platform
