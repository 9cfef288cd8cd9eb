#include "receive/index_keeper.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

namespace kelo::tool {
namespace {

constexpr uint64_t kManyRecords = 20'000; // the index takes them in pieces of 16,384

// In the child's child. It has to be another program: SQLite cannot be used after a fork.
[[noreturn]] void Build(const char *program, const char *database) {
    const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
    for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO})
        dup2(null, stream);
    close_range(STDERR_FILENO + 1, ~0U, 0); // the lock against other receivers too
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
    setpriority(PRIO_PROCESS, 0, 19);
    execl(program, "kelosyslog", "db", "index", "--build", "--db", database, nullptr);
    _exit(0);
}

} // namespace

void IndexKeeper::Tick(const std::string &database, uint64_t stored) {
    if (program_.empty() || stored < covered_ + kManyRecords)
        return;
    covered_ = stored;
    const pid_t child = fork();
    if (child == 0) {
        if (fork() == 0)
            Build(program_.c_str(), database.c_str());
        _exit(0);
    }
    if (child > 0)
        waitpid(child, nullptr, 0);
}

} // namespace kelo::tool
