#pragma once

#include <string>

namespace kelo::platform {

// Sends SIGHUP to the process that the pid file of a service names, /run/SERVICE.pid below the root, after a
// check that it runs `program`. A HUP signal that the process has not taken yet is not sent again.
//
// Returns "" when the process has or will get the signal, else the reason.
std::string HangUpByPidFile(const std::string &service, const std::string &program);

} // namespace kelo::platform
