#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "common/failure.h"
#include "keloplatform/torvc.h"

namespace {

// The code between fork and exec may call only async-signal-safe functions: other threads may hold any lock.

// A fork without the handlers and locks of the C library, whose child sends `exitSignal` at its end. A child
// that sends none is reaped only by a wait with __WALL: neither a wait for any child elsewhere in the process
// nor an ignored SIGCHLD takes its status away.
pid_t Fork(int exitSignal) {
    return static_cast<pid_t>(syscall(SYS_clone, exitSignal, nullptr, nullptr, nullptr, nullptr));
}

int AwaitExitStatus(pid_t child) {
    int status = 0;
    while (waitpid(child, &status, __WALL) < 0) {
        if (errno != EINTR)
            return -1;
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

void ResetSignals() {
    struct sigaction standard {};
    standard.sa_handler = SIG_DFL;
    for (int number = 1; number < NSIG; ++number)
        sigaction(number, &standard, nullptr);
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
}

// Puts standard input and output on /dev/null, and standard error too if the caller has none: a file that the
// command opens must not become one of the three.
void ResetStandardFiles() {
    const bool hasError = fcntl(STDERR_FILENO, F_GETFD) >= 0;
    const int null = open("/dev/null", O_RDWR);
    dup2(null, STDIN_FILENO);
    dup2(null, STDOUT_FILENO);
    if (!hasError)
        dup2(null, STDERR_FILENO);
    if (null > STDERR_FILENO)
        close(null);
}

// Blocks the signals of this thread during its lifetime: a handler of the caller must not run in the child,
// which inherits it until it resets it.
class SignalBlock {
public:
    SignalBlock() {
        sigset_t all;
        sigfillset(&all);
        pthread_sigmask(SIG_SETMASK, &all, &before_);
    }
    ~SignalBlock() { pthread_sigmask(SIG_SETMASK, &before_, nullptr); }
    SignalBlock(const SignalBlock &) = delete;
    SignalBlock &operator=(const SignalBlock &) = delete;

private:
    sigset_t before_;
};

// Keeps what the caller has open until the command has ended: a lock of the caller's, taken with flock(2),
// guards what the command does, also after the caller was killed.
[[noreturn]] void RunCommand(const char *program, char *const *arguments) {
    const pid_t command = Fork(SIGCHLD);
    if (command == 0) {
        close_range(STDERR_FILENO + 1, ~0U, 0);
        execv(program, arguments);
        _exit(127);
    }
    _exit(command > 0 && AwaitExitStatus(command) == 0 ? 0 : 1);
}

} // namespace

int TORVCExec(const char *program, const char *arg1, const char *arg2, const char *arg3, const char *arg4) {
    if (program == nullptr)
        return kelo::platform::FailWithErrno("TORVCExec", "", EINVAL);
    // An exec makes a child visible to every wait again, so the command runs as the child of one that execs
    // nothing.
    const char *arguments[] = {program, arg1, arg2, arg3, arg4, nullptr};
    pid_t keeper;
    {
        const SignalBlock block;
        keeper = Fork(0);
        if (keeper == 0) {
            ResetSignals();
            ResetStandardFiles();
            RunCommand(program, const_cast<char *const *>(arguments));
        }
    }
    if (keeper < 0)
        return kelo::platform::FailWithErrno("TORVCExec", program, errno);
    if (AwaitExitStatus(keeper) != 0)
        return kelo::platform::Fail(KELO_FAILURE_OTHER, "TORVCExec", program,
                                    "the command did not run, or did not end with exit status 0");
    return 0;
}
