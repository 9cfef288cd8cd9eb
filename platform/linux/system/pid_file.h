#pragma once

#include <string>

namespace kelo::platform {

// Sends SIGHUP to the process that a pid file of a service names, after a check that it runs `program`. The
// files, below the root, are /run/SERVICE.pid, which Debian's init script makes syslog-ng write, and
// /var/lib/SERVICE/SERVICE.pid, which it writes by default; the second is used if the first names no such
// process. A HUP signal that is still pending for the process is not sent again.
//
// Returns "" when the process has or will get the signal, else the reason.
std::string HangUpByPidFile(const std::string &service, const std::string &program);

} // namespace kelo::platform
