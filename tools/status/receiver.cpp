#include "status/receiver.h"

#include <sys/stat.h>

#include <cerrno>

#include "status/process.h"

namespace kelo::tool {
namespace {

constexpr const char *kProgram = "kelosyslog";
constexpr int64_t kSilentSec = 60;
constexpr int64_t kClockSlackSec = 5; // the kernel rounds, and clocks are set

// Whether the process exists and is not another one that got its number later.
bool IsAlive(const ReceiverState &told) {
    const auto pid = static_cast<pid_t>(told.pid);
    return ProcessName(pid) == kProgram && ProcessStart(pid) <= told.started + kClockSlackSec;
}

ReceiverStatus::State StateOf(const ReceiverState &told, int64_t now) {
    using State = ReceiverStatus::State;
    if (told.ended != 0)
        return State::Stopped;
    if (!IsAlive(told))
        return State::Died;
    return now - told.updated > kSilentSec ? State::Silent : State::Running;
}

} // namespace

ReceiverStatus GatherReceiver(const std::string &root, int64_t now) {
    ReceiverStatus status;
    status.path = ReceiverStatePath(root);
    if (const std::optional<ReceiverState> told = ReadReceiverState(root)) {
        status.told = *told;
        status.state = StateOf(*told, now);
        return status;
    }
    struct stat file {};
    const bool isMissing = stat(status.path.c_str(), &file) != 0 && (errno == ENOENT || errno == ENOTDIR);
    status.state = isMissing ? ReceiverStatus::State::None : ReceiverStatus::State::Unreadable;
    return status;
}

} // namespace kelo::tool
