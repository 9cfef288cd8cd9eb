#pragma once

#include <optional>
#include <string>

#include "receive/receiver_state.h"

namespace kelo::tool {

// The state of `kelosyslog receive`.
struct ReceiverStatus {
    // None: it never ran here. Silent: it runs, but its state file is older than a minute. Died: it
    // disappeared without ending.
    enum class State { None, Running, Silent, Stopped, Died, Unreadable };
    State state = State::None;
    std::string path; // of its state file
    ReceiverState told;
};

// Reads the state file below `root` and looks for the process; `now` in seconds since the epoch.
ReceiverStatus GatherReceiver(const std::string &root, int64_t now);

} // namespace kelo::tool
