#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>

namespace kelo::tool {

// What became of a question to a syslog-ng through its control socket.
struct ControlAnswer {
    int connectError = 0; // errno of the connection; 0 when somebody listens
    pid_t pid = 0;        // of who listens; 0 when nobody does
    std::string text;     // the answer, without the line "." that ends it
    std::string problem;  // why there is no whole answer; "" when there is
};

// Sends one command ("STATS") to the control socket at `path`, which may be longer than a socket's address,
// and reads the answer. Takes `timeout` at the most, whatever the other side does.
ControlAnswer AskControlSocket(const std::string &path, const std::string &command,
                               std::chrono::milliseconds timeout);

} // namespace kelo::tool
