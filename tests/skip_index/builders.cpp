#include "builders.h"

#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <vector>

#include "keloplatform/skip_index.h"
#include "support/syslog_capture.h"

namespace kelo::test {
namespace {

pid_t Begin(const std::function<void()> &work) {
    const pid_t child = fork();
    if (child == 0) {
        SyslogCapture log;
        work();
        _exit(static_cast<int>(log.TakeTexts().size()));
    }
    return child;
}

size_t LinesOf(pid_t child) {
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? static_cast<size_t>(WEXITSTATUS(status)) : 0;
}

// Whether a traced process is at a call that is counted.
bool IsCounted(pid_t child) {
    __ptrace_syscall_info info{};
    return ptrace(PTRACE_GET_SYSCALL_INFO, child, sizeof info, &info) > 0 &&
           (info.op != PTRACE_SYSCALL_INFO_ENTRY || info.entry.nr != SYS_pread64);
}

} // namespace

void BuildAndKill(const std::string &path, size_t call) {
    const pid_t child = Begin([&] {
        if (ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) == 0)
            raise(SIGSTOP);
        KELODBSkipIndexBuild(path.c_str(), 0);
    });
    int status = 0;
    for (size_t passed = 0; waitpid(child, &status, 0) == child && WIFSTOPPED(status);) {
        passed += IsCounted(child) ? 1 : 0;
        ptrace(PTRACE_SYSCALL, child, nullptr, nullptr);
        if (passed > call)
            kill(child, SIGKILL);
    }
}

size_t BuildWithin(const std::string &path, size_t bytes) {
    return LinesOf(Begin([&] {
        signal(SIGXFSZ, SIG_IGN);
        const rlimit limit{bytes, bytes};
        setrlimit(RLIMIT_FSIZE, &limit);
        KELODBSkipIndexBuild(path.c_str(), 0);
    }));
}

size_t BuildTogether(const std::string &path, size_t builders) {
    std::vector<pid_t> children;
    while (children.size() < builders)
        children.push_back(Begin([&] { KELODBSkipIndexBuild(path.c_str(), 0); }));
    size_t lines = 0;
    for (const pid_t child : children)
        lines += LinesOf(child);
    return lines;
}

} // namespace kelo::test
