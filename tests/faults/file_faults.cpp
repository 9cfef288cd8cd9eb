#include "faults/file_faults.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <mutex>
#include <set>

#include "support/doubles.h"

namespace kelo::test {
namespace {

// Threads of a test write at once.
struct State {
    FileFaults::Kind kind = FileFaults::Kind::kWrite;
    NthCall failing;
    std::set<ino_t> unsynced;
};
State state;
std::mutex stateMutex;

bool MustFail(bool isRead) {
    const std::lock_guard lock(stateMutex);
    if (isRead != (state.kind == FileFaults::Kind::kRead) || !state.failing.MustFail())
        return false;
    errno = state.kind == FileFaults::Kind::kFull ? ENOSPC : EIO;
    return true;
}

ino_t Inode(int fd) {
    struct stat file {};
    fstat(fd, &file);
    return file.st_ino;
}

// How much of `size` bytes is written at once; the file then has to be synced.
size_t Share(int fd, size_t size) {
    const std::lock_guard lock(stateMutex);
    // SQLite makes room for shared memory by single bytes, which need not reach the disk.
    if (state.failing.times == 0 || size <= 1)
        return size;
    const FaultPause pause;
    state.unsynced.insert(Inode(fd));
    return size / 2;
}

int Sync(int fd) {
    if (MustFail(false))
        return -1;
    const std::lock_guard lock(stateMutex);
    const FaultPause pause;
    state.unsynced.erase(Inode(fd));
    return 0;
}

} // namespace

void FileFaults::Start(Kind kind, int first, int times) {
    const std::lock_guard lock(stateMutex);
    state = {kind, {first, times}, {}};
}

bool FileFaults::Stop() {
    const std::lock_guard lock(stateMutex);
    state.failing.times = 0;
    return state.failing.hasFailed;
}

bool FileFaults::HasUnsynced() {
    return !state.unsynced.empty();
}

bool FileFaults::IsUnsynced(const std::string &path) {
    struct stat file;
    return stat(path.c_str(), &file) != 0 || state.unsynced.contains(file.st_ino);
}

} // namespace kelo::test

using namespace kelo::test;

#define KELO_OR_FAIL(isRead, name, ...) (MustFail(isRead) ? -1 : Real<&name>(#name)(__VA_ARGS__))

extern "C" {

ssize_t read(int fd, void *data, size_t size) {
    return KELO_OR_FAIL(true, read, fd, data, size);
}
ssize_t pread64(int fd, void *data, size_t size, off64_t offset) {
    return KELO_OR_FAIL(true, pread64, fd, data, size, offset);
}
ssize_t write(int fd, const void *data, size_t size) {
    return KELO_OR_FAIL(false, write, fd, data, Share(fd, size));
}
ssize_t pwrite64(int fd, const void *data, size_t size, off64_t offset) {
    return KELO_OR_FAIL(false, pwrite64, fd, data, Share(fd, size), offset);
}
int ftruncate64(int fd, off64_t size) noexcept {
    return KELO_OR_FAIL(false, ftruncate64, fd, size);
}
int fchmod(int fd, mode_t mode) noexcept {
    return KELO_OR_FAIL(false, fchmod, fd, mode);
}
int fsync(int fd) {
    return Sync(fd);
}
int fdatasync(int fd) {
    return Sync(fd);
}
int renameat(int oldFolder, const char *oldName, int newFolder, const char *newName) noexcept {
    return KELO_OR_FAIL(false, renameat, oldFolder, oldName, (Share(newFolder, 2), newFolder), newName);
}

} // extern "C"
