#include "keloplatform/kelosystem.h"
#include "keloplatform/torvc.h"
#include "support/test.h"

namespace kelo::test {
namespace {

int Shell(const std::string &command) {
    return TORVCExec("/bin/sh", "-c", command.c_str(), nullptr, nullptr);
}

TEST(TORVCExec, SaysWhetherTheCommandSucceeded) {
    const struct {
        const char *program, *words[4];
        int status;
    } cases[] = {
        {"/bin/true", {}, 0},
        {"/bin/sh", {"-c", "exit 1"}, -1},
        {"/bin/sh", {"-c", "exit 255"}, -1},
        {"/bin/sh", {"-c", "kill -9 $$"}, -1},
        {"/no/such/program", {}, -1},
        {"/etc/passwd", {}, -1},
        {nullptr, {}, -1},
        {"/usr/bin/test", {"a", "=", "a"}, 0},
        {"/usr/bin/test", {"a", nullptr, "=", "b"}, 0}, // the first null ends the arguments
        {"/usr/bin/test", {""}, -1},                    // an empty one does not
    };
    for (const auto &[program, words, status] : cases)
        EXPECT_EQ(TORVCExec(program, words[0], words[1], words[2], words[3]), status)
            << &status - &cases[0].status;
}

TEST(TORVCExec, GivesTheCommandACleanStart) {
    const TempRoot root;
    const std::string list = root.File("list");
    const int inherited = open("/dev/null", O_RDONLY); // not close-on-exec
    const int lowError = dup(STDERR_FILENO);
    sigset_t all, before, after;
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
        EXPECT_THAT(files,
                    AllOf(HasSubstr(" 0 -> /dev/null\n"), HasSubstr(" 2 -> "), Not(HasSubstr(" 4 -> "))));
        EXPECT_THAT(files, HasSubstr(" 3 -> /proc/")) << "what it reads itself";
        EXPECT_EQ(ReadFile(root.File("signals")), "SigBlk:\t0000000000000000\nSigIgn:\t0000000000000000\n");
    }
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
