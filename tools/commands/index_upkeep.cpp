#include "commands/index_upkeep.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>

#include "base/errors.h"
#include "keloplatform/cluster.h"
#include "keloplatform/skip_index.h"
#include "read/read_only_query.h"

namespace kelo::tool {
namespace {

constexpr int64_t kManyRows = 20'000; // a search reads them in some milliseconds

bool IsBehind(const LogTable &table) {
    // The search has just learnt it, if it used the index.
    if (const int64_t lag = KELODBSkipIndexLag(); lag >= 0)
        return lag >= kManyRows;
    if (KELODBIsCluster(table.path.c_str()) != 0)
        return false;
    try {
        const KELODBSkipIndex index = ReadOnlyQuery(table).SkipIndex();
        return index.isPossible != 0 && index.newestId - (index.isThere != 0 ? index.endId : 0) >= kManyRows;
    } catch (const DatabaseError &) { // the search has found what is wrong, or another one will
        return false;
    }
}

bool MayWriteBeside(const std::string &path) {
    const std::string folder = path.substr(0, path.rfind('/') + 1);
    return faccessat(AT_FDCWD, folder.c_str(), W_OK, AT_EACCESS) == 0;
}

// In the child's child. Whoever waits for the program's output does not wait for this one.
[[noreturn]] void Extend(const std::string &path) {
    setsid();
    const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
    for (const int stream : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO})
        dup2(null, stream);
    setpriority(PRIO_PROCESS, 0, 19);
    KELODBSkipIndexBuild(path.c_str(), 0);
    _exit(0);
}

} // namespace

void ExtendIndexLater(const LogTable &table) {
    if (table.name != "logs" || std::getenv("KELO_SKIP_INDEX") != nullptr || !MayWriteBeside(table.path) ||
        !IsBehind(table))
        return;
    const pid_t child = fork();
    if (child == 0) {
        if (fork() == 0)
            Extend(table.path);
        _exit(0);
    }
    if (child > 0)
        waitpid(child, nullptr, 0);
}

} // namespace kelo::tool
