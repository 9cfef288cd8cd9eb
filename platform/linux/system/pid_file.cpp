#include "system/pid_file.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <fstream>

#include "common/root.h"
#include "common/unique_fd.h"

namespace kelo::platform {
namespace {

// The kernel cuts a process's name to this length.
constexpr size_t kNameLength = 15;

std::string NameOf(pid_t pid) {
    std::string name;
    std::getline(std::ifstream("/proc/" + std::to_string(pid) + "/comm"), name);
    return name;
}

// Returns "" when the process that the file names has or will get the signal, else the reason.
std::string HangUp(const std::string &path, const std::string &program) {
    std::ifstream file(path);
    pid_t pid = 0;
    if (!(file >> pid) || pid <= 0 || !(file >> std::ws).eof())
        return "no process id in " + path;
    // The descriptor identifies the process, so that the process that was checked gets the signal.
    const UniqueFd process(static_cast<int>(syscall(SYS_pidfd_open, pid, 0)));
    if (process.Get() < 0 || NameOf(pid) != program.substr(0, kNameLength))
        return "process " + std::to_string(pid) + " of " + path + " is not " + program;
    // A HUP signal that is still pending swallows this one: the kernel does not queue it twice.
    if (syscall(SYS_pidfd_send_signal, process.Get(), SIGHUP, nullptr, 0) != 0)
        return "process " + std::to_string(pid) + ": " + std::strerror(errno);
    return "";
}

} // namespace

std::string HangUpByPidFile(const std::string &service, const std::string &program) {
    const std::string ofInitScript = RootedPath("/run/" + service + ".pid");
    const std::string ofDaemon = RootedPath("/var/lib/" + service + "/" + service + ".pid");
    std::string problems;
    for (const std::string &path : {ofInitScript, ofDaemon}) {
        if (access(path.c_str(), F_OK) != 0)
            continue;
        const std::string problem = HangUp(path, program);
        if (problem.empty())
            return "";
        problems += (problems.empty() ? "" : "; ") + problem;
    }
    return problems.empty() ? "no systemd, and no pid file " + ofInitScript + " or " + ofDaemon : problems;
}

} // namespace kelo::platform
