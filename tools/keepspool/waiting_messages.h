#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

namespace kelo::tool {

// A message in a disk buffer of syslog-ng, with the bytes that it was parsed into.
struct WaitingMessage {
    std::string_view header; // "UTC TZ FAC LEVEL TAG IP", as in a record of the message spool
    std::string_view host;
    std::string_view program;
    std::string_view message;
};

// Passes on each message that waits in the disk buffer at `path`, in their order, and returns their number.
// The file is not changed. Throws OutputError, which names the file and the reason, also when dqtool cannot
// read as many as there should be.
uint64_t ReadWaitingMessages(const std::string &path,
                             const std::function<void(const WaitingMessage &)> &take);

} // namespace kelo::tool
