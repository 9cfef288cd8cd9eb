#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>

namespace kelo::tool {

// The result of a request to a syslog-ng through its control socket.
struct ControlAnswer {
    int connectError = 0; // errno of the connection; 0 when a process listens
    pid_t pid = 0;        // of the listening process; 0 when there is none
    std::string text;     // the answer, without the line "." that ends it
    std::string problem;  // why the answer is incomplete; "" when it is complete
};

// Sends one command ("STATS") to the control socket at `path`, which may be longer than a socket's address,
// and reads the answer. Takes `timeout` at most in any case.
ControlAnswer AskControlSocket(const std::string &path, const std::string &command,
                               std::chrono::milliseconds timeout);

} // namespace kelo::tool
