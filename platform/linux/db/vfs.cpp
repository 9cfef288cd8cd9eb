#include "keloplatform/vfs.h"

#include <sqlite3.h>

#include <mutex>

namespace {

constexpr char kName[] = "kelo-without-super-journal";

// Written once, under the mutex, before SQLite knows it.
sqlite3_vfs guarded;
sqlite3_vfs *base;
std::mutex mutex;

int Open(sqlite3_vfs *, const char *path, sqlite3_file *file, int flags, int *outFlags) {
    if ((flags & SQLITE_OPEN_SUPER_JOURNAL) != 0) {
        file->pMethods = nullptr; // nothing to close
        return SQLITE_CANTOPEN;
    }
    return base->xOpen(base, path, file, flags, outFlags);
}

} // namespace

const char *KELODBVfs() {
    const std::lock_guard lock(mutex);
    if (base == nullptr && (base = sqlite3_vfs_find(nullptr)) != nullptr) {
        guarded = *base;
        guarded.zName = kName;
        guarded.xOpen = Open;
        guarded.pNext = nullptr;
        sqlite3_vfs_register(&guarded, 0);
    }
    return kName;
}
