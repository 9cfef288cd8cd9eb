#include "keloplatform/kelosystem.h"
#include "keloplatform/torvc.h"
#include "support/test.h"

namespace kelo::test {
namespace {

int Shell(const std::string &command) {
    return TORVCExec("/bin/sh", "-c", command.c_str(), nullptr, nullptr);
}

TEST(TORVCExec, SaysWhetherTheCommandSucceeded) {
    EXPECT_EQ(TORVCExec("/bin/true", nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(Shell("exit 1"), -1);
    EXPECT_EQ(Shell("exit 255"), -1);
    EXPECT_EQ(Shell("kill -9 $$"), -1);
    EXPECT_EQ(TORVCExec("/no/such/program", nullptr, nullptr, nullptr, nullptr), -1);
    EXPECT_EQ(TORVCExec("/etc/passwd", nullptr, nullptr, nullptr, nullptr), -1);
    EXPECT_EQ(TORVCExec(nullptr, nullptr, nullptr, nullptr, nullptr), -1);
    EXPECT_EQ(TORVCExec("/usr/bin/test", "a", "=", "a", nullptr), 0);
    EXPECT_EQ(TORVCExec("/usr/bin/test", "a", nullptr, "=", "b"), 0) << "the first null ends the arguments";
    EXPECT_EQ(TORVCExec("/usr/bin/test", "", nullptr, nullptr, nullptr), -1) << "an empty one does not";
}

TEST(TORVCExec, GivesTheCommandACleanStart) {
    const TempRoot root;
    const std::string list = root.File("list");
    const int inherited = open("/dev/null", O_RDONLY); // not close-on-exec
    const int lowError = dup(STDERR_FILENO);
    sigset_t all;
    sigset_t before;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &before);
    const auto oldPipe = std::signal(SIGPIPE, SIG_IGN);
    const auto oldHup = std::signal(SIGHUP, SIG_IGN);
    for (const bool hasStandardFiles : {true, false}) {
        if (!hasStandardFiles) {
            close(STDIN_FILENO);
            close(STDERR_FILENO);
        }
        // The shell becomes the program, so that nothing of its own is seen.
        EXPECT_EQ(Shell("exec ls -l /proc/self/fd > " + list), 0);
        EXPECT_EQ(Shell("exec grep -E 'Sig(Blk|Ign)' /proc/self/status > " + root.File("signals")), 0);
        if (!hasStandardFiles) {
            open("/dev/null", O_RDONLY);
            dup2(lowError, STDERR_FILENO);
        }
        const std::string files = ReadFile(list);
        EXPECT_NE(files.find(" 0 -> /dev/null\n"), std::string::npos) << files;
        EXPECT_NE(files.find(" 2 -> "), std::string::npos) << files;
        EXPECT_NE(files.find(" 3 -> /proc/"), std::string::npos) << "what it reads itself: " << files;
        EXPECT_EQ(files.find(" 4 -> "), std::string::npos) << files;
        EXPECT_EQ(ReadFile(root.File("signals")), "SigBlk:\t0000000000000000\nSigIgn:\t0000000000000000\n");
    }
    sigset_t after;
    pthread_sigmask(SIG_SETMASK, &before, &after);
    EXPECT_TRUE(sigismember(&after, SIGTERM)) << "the caller's mask is its own";
    std::signal(SIGPIPE, oldPipe);
    std::signal(SIGHUP, oldHup);
    close(inherited);
    close(lowError);
}

TEST(TORVCExec, GetsItsStatusWhereTheKernelReapsChildren) {
    const auto before = std::signal(SIGCHLD, SIG_IGN); // the kernel reaps children itself
    EXPECT_EQ(Shell("exit 0"), 0);
    EXPECT_EQ(Shell("exit 3"), -1);
    std::signal(SIGCHLD, before);
}

TEST(KELOFSMkdirP, CreatesParentsAndSaysWhatIsInItsWay) {
    const TempRoot root;
    const mode_t mask = umask(027);
    const auto make = [](const std::string &path) { return KELOFSMkdirP(path.c_str(), 0, 1, -1, -1, 0777); };
    EXPECT_EQ(make(root.File("a/b//c/")), 0);
    EXPECT_EQ(make(root.File("a/b/c")), 0);
    EXPECT_EQ(make(""), 0);
    EXPECT_EQ(make("/"), 0);
    umask(mask);
    struct stat status {};
    ASSERT_EQ(stat(root.File("a/b/c").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0750u);
    WriteFile(root.File("file"), "");
    EXPECT_EQ(make(root.File("file")), -1);
    EXPECT_EQ(errno, ENOTDIR);
    EXPECT_EQ(make(root.File("file/below")), -1);
    EXPECT_EQ(make("/proc/none/below"), -1);
    EXPECT_EQ(KELOFSMkdirP(nullptr, 0, 1, -1, -1, 0777), -1);
}

} // namespace
} // namespace kelo::test
