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

    // Opens the existing file: for writing, else for reading. Null when that is impossible, or when the path
    // is no regular file (a FIFO would wait for its other end for ever).
    //
    // A database in WAL mode needs its "-shm" file, which a reader without write permission in the folder
    // cannot create. Where no "-wal" file holds rows either, nobody has the database open and the main file
    // is complete: it is then read without locks, and HasChanged() tells whether that has stopped being true.
    Database Open();

    // True when the file is read without locks and somebody has written to it since.
    bool HasChanged() const;

private:
    bool IsAtRestInReadOnlyFolder() const;
    Database OpenWithoutLocks();

    // Absolute, as SQLite resolves it to name the files beside it; so neither "file:x" nor ":memory:" is more
    // than a name. Empty where there is no such file.
    std::string path_;
    std::optional<struct stat> atRest_; // set when the file is read without locks
};

} // namespace kelo::platform
