#include "status/process.h"

#include <unistd.h>

#include <fstream>
#include <sstream>

namespace kelo::tool {
namespace {

std::string ProcFile(pid_t pid, const char *name) {
    return "/proc/" + std::to_string(pid) + "/" + name;
}

// When the machine was started, in seconds since the epoch; 0 if that cannot be read.
int64_t BootTime() {
    std::ifstream file("/proc/stat");
    for (std::string line; std::getline(file, line);) {
        if (line.starts_with("btime "))
            return std::stoll(line.substr(6));
    }
    return 0;
}

} // namespace

std::string ProcessName(pid_t pid) {
    std::string name;
    std::getline(std::ifstream(ProcFile(pid, "comm")), name);
    return name;
}

int64_t ProcessStart(pid_t pid) {
    std::string line;
    std::getline(std::ifstream(ProcFile(pid, "stat")), line);
    // The name in parentheses may contain any byte; field 22 is the twentieth after it.
    const size_t end = line.rfind(')');
    if (end == std::string::npos)
        return 0;
    std::istringstream fields(line.substr(end + 1));
    std::string skipped;
    for (int field = 3; field < 22; ++field)
        fields >> skipped;
    int64_t ticks = 0;
    return fields >> ticks ? BootTime() + ticks / sysconf(_SC_CLK_TCK) : 0;
}

} // namespace kelo::tool
