#include "faults/file_faults.h"

#include <sqlite3.h>

#include <new>
#include <set>

#include "support/fault_pause.h"

namespace kelo::test {
namespace {

struct State {
    bool isActive = false;
    FileFaults::Kind kind = FileFaults::Kind::kWrite;
    int count = 0;
    int failFirst = 0;
    int failTimes = 0;
    bool hasFailed = false;
    std::set<const void *> unsynced;
};
State state;

// The result of an operation that has to fail, or SQLITE_OK. `error` is the input/output error to give.
int Injected(bool isRead, int error) {
    if (!state.isActive || isRead != (state.kind == FileFaults::Kind::kRead))
        return SQLITE_OK;
    ++state.count;
    if (state.count < state.failFirst || state.count - state.failFirst >= state.failTimes)
        return SQLITE_OK;
    state.hasFailed = true;
    return state.kind == FileFaults::Kind::kFull ? SQLITE_FULL : error;
}

// A file of ours: SQLite's part first, then the real file in the same block.
struct ShimFile {
    sqlite3_file base;
    sqlite3_file *Real() { return reinterpret_cast<sqlite3_file *>(this + 1); }
};

sqlite3_file *Real(sqlite3_file *file) {
    return reinterpret_cast<ShimFile *>(file)->Real();
}

void MarkUnsynced(sqlite3_file *file) {
    const FaultPause pause;
    state.unsynced.insert(file);
}

void MarkSynced(sqlite3_file *file) {
    const FaultPause pause;
    state.unsynced.erase(file);
}

int Write(sqlite3_file *file, const void *data, int size, sqlite3_int64 offset) {
    if (const int error = Injected(false, SQLITE_IOERR_WRITE); error != SQLITE_OK)
        return error;
    MarkUnsynced(file);
    return Real(file)->pMethods->xWrite(Real(file), data, size, offset);
}

int Truncate(sqlite3_file *file, sqlite3_int64 size) {
    if (const int error = Injected(false, SQLITE_IOERR_TRUNCATE); error != SQLITE_OK)
        return error;
    MarkUnsynced(file);
    return Real(file)->pMethods->xTruncate(Real(file), size);
}

// Nothing here survives a real power loss, so the wait for the disk is spared.
int Sync(sqlite3_file *file, int) {
    if (const int error = Injected(false, SQLITE_IOERR_FSYNC); error != SQLITE_OK)
        return error;
    MarkSynced(file);
    return SQLITE_OK;
}

int Read(sqlite3_file *file, void *data, int size, sqlite3_int64 offset) {
    if (const int error = Injected(true, SQLITE_IOERR_READ); error != SQLITE_OK)
        return error;
    return Real(file)->pMethods->xRead(Real(file), data, size, offset);
}

int Close(sqlite3_file *file) {
    return Real(file)->pMethods->xClose(Real(file));
}

// Hands an operation on to the real file.
template <auto Method, typename... Arguments>
int Forward(sqlite3_file *file, Arguments... arguments) {
    return (Real(file)->pMethods->*Method)(Real(file), arguments...);
}

void ShmBarrier(sqlite3_file *file) {
    Real(file)->pMethods->xShmBarrier(Real(file));
}

// Version 2: with shared memory, as a WAL needs it; without memory-mapped pages, which no read would go
// through.
const sqlite3_io_methods kMethods = {
    2,
    Close,
    Read,
    Write,
    Truncate,
    Sync,
    Forward<&sqlite3_io_methods::xFileSize>,
    Forward<&sqlite3_io_methods::xLock>,
    Forward<&sqlite3_io_methods::xUnlock>,
    Forward<&sqlite3_io_methods::xCheckReservedLock>,
    Forward<&sqlite3_io_methods::xFileControl>,
    Forward<&sqlite3_io_methods::xSectorSize>,
    Forward<&sqlite3_io_methods::xDeviceCharacteristics>,
    Forward<&sqlite3_io_methods::xShmMap>,
    Forward<&sqlite3_io_methods::xShmLock>,
    ShmBarrier,
    Forward<&sqlite3_io_methods::xShmUnmap>,
    nullptr,
    nullptr,
};

sqlite3_vfs *realVfs = nullptr;

int Open(sqlite3_vfs *, const char *name, sqlite3_file *file, int flags, int *outFlags) {
    auto *shim = new (file) ShimFile{};
    const int status = realVfs->xOpen(realVfs, name, shim->Real(), flags, outFlags);
    if (shim->Real()->pMethods != nullptr)
        shim->base.pMethods = &kMethods;
    MarkSynced(file);
    return status;
}

} // namespace

void FileFaults::Install() {
    if (realVfs != nullptr)
        return;
    realVfs = sqlite3_vfs_find(nullptr);
    static sqlite3_vfs shim = *realVfs;
    shim.zName = "kelo-file-faults";
    shim.szOsFile = static_cast<int>(sizeof(ShimFile)) + realVfs->szOsFile;
    shim.xOpen = Open;
    sqlite3_vfs_register(&shim, 1);
}

void FileFaults::Start(Kind kind, int first, int times) {
    Install();
    state = {true, kind, 0, first, times, false, {}};
}

bool FileFaults::Stop() {
    state.isActive = false;
    return state.hasFailed;
}

bool FileFaults::HasUnsynced() {
    return !state.unsynced.empty();
}

} // namespace kelo::test
