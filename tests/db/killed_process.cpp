#include "db/killed_process.h"

#include <sys/ptrace.h>
#include <sys/syscall.h>

#include "support/test.h"

namespace kelo::test {
namespace {

constexpr int kOptions = PTRACE_O_TRACESYSGOOD | PTRACE_O_TRACEFORK | PTRACE_O_TRACEVFORK |
                         PTRACE_O_TRACECLONE | PTRACE_O_TRACEEXEC | PTRACE_O_EXITKILL;

pid_t Start(const std::function<int()> &work) {
    const pid_t process = fork();
    if (process == 0)
        _exit(work());
    return process;
}

// Whether the process, stopped for a system call, is about to make one that changes something.
bool IsChange(pid_t process) {
    __ptrace_syscall_info call{};
    ptrace(PTRACE_GET_SYSCALL_INFO, process, sizeof call, &call);
    if (call.op != PTRACE_SYSCALL_INFO_ENTRY)
        return false;
    static const std::set<uint64_t> kChanges = {
        SYS_clone,  SYS_vfork,     SYS_execve,   SYS_exit_group, SYS_write,  SYS_pwrite64, SYS_fdatasync,
        SYS_unlink, SYS_ftruncate, SYS_mkdir,    SYS_fchmod,     SYS_fchown, SYS_flock,    SYS_link,
        SYS_rename, SYS_fsync,     SYS_renameat, SYS_unlinkat,   SYS_mkdirat};
    return kChanges.contains(call.entry.nr) ||
           (call.entry.nr == SYS_openat && (call.entry.args[2] & O_CREAT) != 0);
}

} // namespace

std::optional<int> KillAtCall(int number, Victim victim, const std::function<void()> &work,
                              const std::function<int()> &heir) {
    const pid_t process = Start([&] {
        ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
        raise(SIGSTOP);
        work();
        return 0;
    });
    std::set<pid_t> traced = {process};
    std::optional<pid_t> heirProcess;
    std::optional<int> heirStatus;
    int calls = 0;
    int status = 0;
    waitpid(process, &status, 0);
    ptrace(PTRACE_SETOPTIONS, process, nullptr, kOptions);
    ptrace(PTRACE_SYSCALL, process, nullptr, nullptr);
    while (!traced.empty() || (heirProcess && !heirStatus)) {
        const pid_t stopped = waitpid(-1, &status, __WALL);
        if (!WIFSTOPPED(status)) {
            traced.erase(stopped);
            if (stopped == heirProcess)
                heirStatus = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
            continue;
        }
        traced.insert(stopped);
        const bool isCall = WSTOPSIG(status) == (SIGTRAP | 0x80);
        const bool isTheCall = isCall && IsChange(stopped) && ++calls == number;
        for (const pid_t candidate : traced) {
            if ((victim == Victim::kAll && calls >= number) ||
                (isTheCall && candidate == (victim == Victim::kCaller ? stopped : process)))
                kill(candidate, SIGKILL);
        }
        if (isTheCall)
            heirProcess = Start(heir);
        // A stop of the tracing itself is no signal for the process.
        const bool isSignal = !isCall && WSTOPSIG(status) != SIGTRAP && WSTOPSIG(status) != SIGSTOP;
        ptrace(PTRACE_SYSCALL, stopped, nullptr, isSignal ? WSTOPSIG(status) : 0);
    }
    return heirStatus;
}

} // namespace kelo::test
