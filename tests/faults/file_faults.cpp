#include "faults/file_faults.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <set>

#include "support/fault_pause.h"
#include "support/real_function.h"

namespace kelo::test {
namespace {

struct State {
    FileFaults::Kind kind = FileFaults::Kind::kWrite;
    int failFirst = 0;
    int failTimes = 0; // 0 while nothing is to fail
    int count = 0;
    bool hasFailed = false;
    std::set<ino_t> unsynced;
};
State state;

bool MustFail(bool isRead) {
    if (state.failTimes == 0 || isRead != (state.kind == FileFaults::Kind::kRead))
        return false;
    const int past = ++state.count - state.failFirst;
    if (past < 0 || past >= state.failTimes)
        return false;
    state.hasFailed = true;
    errno = state.kind == FileFaults::Kind::kFull ? ENOSPC : EIO;
    return true;
}

// How much of `size` bytes is written at once; the file then has to be synced.
size_t Share(int fd, size_t size) {
    // SQLite makes room for shared memory by single bytes, which need not reach the disk.
    if (state.failTimes == 0 || size <= 1)
        return size;
    const FaultPause pause;
    struct stat file;
    if (fstat(fd, &file) == 0)
        state.unsynced.insert(file.st_ino);
    return size / 2;
}

int Sync(int fd) {
    if (MustFail(false))
        return -1;
    const FaultPause pause;
    struct stat file;
    if (fstat(fd, &file) == 0)
        state.unsynced.erase(file.st_ino);
    return 0;
}

} // namespace

void FileFaults::Start(Kind kind, int first, int times) {
    state = {kind, first, times, 0, false, {}};
}

bool FileFaults::Stop() {
    state.failTimes = 0;
    return state.hasFailed;
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

extern "C" {

ssize_t read(int fd, void *data, size_t size) {
    static const auto real = Real<&read>("read");
    return MustFail(true) ? -1 : real(fd, data, size);
}
ssize_t pread64(int fd, void *data, size_t size, off64_t offset) {
    static const auto real = Real<&pread64>("pread64");
    return MustFail(true) ? -1 : real(fd, data, size, offset);
}
ssize_t write(int fd, const void *data, size_t size) {
    static const auto real = Real<&write>("write");
    return MustFail(false) ? -1 : real(fd, data, Share(fd, size));
}
ssize_t pwrite64(int fd, const void *data, size_t size, off64_t offset) {
    static const auto real = Real<&pwrite64>("pwrite64");
    return MustFail(false) ? -1 : real(fd, data, Share(fd, size), offset);
}
int ftruncate64(int fd, off64_t size) noexcept {
    static const auto real = Real<&ftruncate64>("ftruncate64");
    return MustFail(false) ? -1 : real(fd, size);
}
int fchmod(int fd, mode_t mode) noexcept {
    static const auto real = Real<&fchmod>("fchmod");
    return MustFail(false) ? -1 : real(fd, mode);
}
int fsync(int fd) {
    return Sync(fd);
}
int fdatasync(int fd) {
    return Sync(fd);
}
int renameat(int oldFolder, const char *oldName, int newFolder, const char *newName) noexcept {
    static const auto real = Real<&renameat>("renameat");
    if (MustFail(false))
        return -1;
    Share(newFolder, 2);
    return real(oldFolder, oldName, newFolder, newName);
}

} // extern "C"
