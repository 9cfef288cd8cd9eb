#include "support/memory.h"

#include <fstream>
#include <string>

#include "support/measure.h"

namespace kelo::bench {
namespace {

size_t StatusBytes(const std::string &field) {
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line)) {
        if (line.starts_with(field + ":"))
            return std::stoul(line.substr(field.size() + 1)) * 1024;
    }
    Fail("no " + field + " in /proc/self/status");
}

} // namespace

size_t PeakMemoryOf(const std::function<void()> &work) {
    std::ofstream reset("/proc/self/clear_refs");
    if (!(reset << "5" << std::flush)) // makes the present size the peak
        Fail("cannot reset the peak memory");
    const size_t before = StatusBytes("VmRSS");
    work();
    return StatusBytes("VmHWM") - before;
}

} // namespace kelo::bench
