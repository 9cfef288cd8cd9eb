#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "keloplatform/torvc.h"
#include "support/temp_root.h"

using kelo::test::ReadFile;
using kelo::test::TempRoot;
using kelo::test::WriteFile;

namespace {

// What happens at the system call `at` (from 1) that changes files.
enum class Fault { kNone, kFail, kCrash };
Fault fault = Fault::kNone;
int calls = 0;
int at = 0;

// Whether the call has to fail; does not return where it has to crash.
bool Fails() {
    if (fault == Fault::kNone || ++calls != at)
        return false;
    if (fault == Fault::kCrash)
        _exit(0);
    errno = ENOSPC;
    return true;
}

template <auto *Function>
auto Real(const char *name) {
    return reinterpret_cast<decltype(Function)>(dlsym(RTLD_NEXT, name));
}

} // namespace

extern "C" {

ssize_t write(int fd, const void *data, size_t size) {
    // Half of the data reaches the file first.
    const auto real = Real<&write>("write");
    return Fails() ? -1 : real(fd, data, fault != Fault::kNone && size > 1 ? size / 2 : size);
}
int fsync(int fd) {
    return Fails() ? -1 : Real<&fsync>("fsync")(fd);
}
int fchmod(int fd, mode_t mode) {
    return Fails() ? -1 : Real<&fchmod>("fchmod")(fd, mode);
}
int renameat(int oldFolder, const char *oldName, int newFolder, const char *newName) {
    return Fails() ? -1 : Real<&renameat>("renameat")(oldFolder, oldName, newFolder, newName);
}

} // extern "C"

namespace {

constexpr char kOld[] = "[R]\nkey=\"old\"\n";
constexpr char kNew[] = "[R]\nkey=\"new\"\n";

int Write(const std::string &path, const char *section, const char *value) {
    TORVSZHASH *hash = TORVCSzHashAlloc(1);
    TORVCSzHashSetValue(&hash, "key", value);
    const int status = TORVCFileSetSection(path.c_str(), section, section, hash, "%s=\"%s\"\n");
    TORVCSzHashFree(hash);
    return status;
}

size_t FileCount(const std::string &folder) {
    return static_cast<size_t>(std::distance(std::filesystem::directory_iterator(folder), {}));
}

// Runs `body` in a child process, which exits with status 1 where `body` returns.
template <typename Body>
pid_t Start(Body body) {
    const pid_t child = fork();
    if (child == 0) {
        body();
        _exit(1);
    }
    return child;
}

} // namespace

TEST(SectionFileFault, FailedCallLeavesTheOldFileAndNothingElse) {
    const TempRoot root;
    const std::string path = root.File("notify.conf");
    int status = -1;
    for (at = 1; status != 0; ++at) {
        ASSERT_LT(at, 50);
        WriteFile(path, kOld);
        calls = 0;
        fault = Fault::kFail;
        status = Write(path, "R", "new");
        fault = Fault::kNone;
        const bool isRenamed = ReadFile(path) == kNew; // only the folder's sync can fail after that
        EXPECT_TRUE(isRenamed || (status != 0 && ReadFile(path) == kOld)) << at << ": " << ReadFile(path);
        EXPECT_EQ(FileCount(root.Path()), 1u) << at;
    }
    EXPECT_GT(at, 6);
}

TEST(SectionFileFault, CrashLeavesTheOldOrTheNewFile) {
    const TempRoot root;
    const std::string path = root.File("notify.conf");
    bool ended = false;
    for (at = 1; !ended; ++at) {
        ASSERT_LT(at, 50);
        WriteFile(path, kOld);
        const pid_t child = Start([&] {
            calls = 0;
            fault = Fault::kCrash;
            Write(path, "R", "new");
        });
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        ended = WEXITSTATUS(status) == 1;
        EXPECT_TRUE(ReadFile(path) == kNew || (!ended && ReadFile(path) == kOld)) << at << ReadFile(path);
        EXPECT_EQ(Write(path, "R", "new"), 0); // no lock and no temporary file stays in the way
        EXPECT_EQ(FileCount(root.Path()), 1u) << at;
    }
    EXPECT_GT(at, 6);
}

TEST(SectionFileFault, WritersOfDifferentSectionsLoseNothing) {
    constexpr int kWriters = 4;
    constexpr int kSections = 25;
    const TempRoot root;
    const std::string path = root.File("notify.conf"); // does not exist at the start
    std::vector<pid_t> writers;
    for (int writer = 0; writer < kWriters; ++writer) {
        writers.push_back(Start([&] {
            int failures = 0;
            for (int i = 0; i < kSections; ++i) {
                const std::string name = std::to_string(writer) + "-" + std::to_string(i);
                failures += Write(path, name.c_str(), name.c_str()) != 0;
            }
            _exit(failures);
        }));
    }
    for (const pid_t writer : writers) {
        int status = -1;
        ASSERT_EQ(waitpid(writer, &status, 0), writer);
        EXPECT_EQ(status, 0);
    }
    TORVSZLIST *list = TORVCSzListAlloc(1024);
    EXPECT_EQ(TORVCFileEnumSection(path.c_str(), &list), 0);
    EXPECT_EQ(list->count, kWriters * kSections);
    TORVCSzListFree(list);
}
