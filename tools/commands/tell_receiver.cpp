#include "commands/tell_receiver.h"

#include <cerrno>
#include <csignal>
#include <cstring>
#include <ctime>

#include "cli/program.h"
#include "status/receiver.h"

namespace kelo::tool {

void TellReceiver(const std::string &root, const std::string &what) {
    const ReceiverStatus receiver = GatherReceiver(root, std::time(nullptr));
    if (receiver.state != ReceiverStatus::State::Running && receiver.state != ReceiverStatus::State::Silent)
        return;
    if (kill(static_cast<pid_t>(receiver.told.pid), SIGHUP) != 0 && errno != ESRCH)
        PrintMessage("the receiver goes on with " + what + ": process " + std::to_string(receiver.told.pid) +
                     " cannot be sent SIGHUP: " + std::strerror(errno));
}

} // namespace kelo::tool
