#pragma once

#include <exception>
#include <vector>

#include "base/event_loop.h"

namespace kelo::tool {

// The user or the service manager asked the program to stop; what was half done has been undone.
struct Interrupted : std::exception {
    explicit Interrupted(int by) : signal(by) {}
    int signal;
};

// For work without an event loop that checks now and then whether to stop: while the object lives, INT, TERM
// and HUP have no other effect. A signal that is ignored stays ignored, for example HUP under nohup. One
// object at a time.
class StopSignals {
public:
    // Throws std::system_error.
    StopSignals();
    // Restores the effect of the signals.
    ~StopSignals();
    StopSignals(const StopSignals &) = delete;
    StopSignals &operator=(const StopSignals &) = delete;

    // The signal that came first, 0 for none so far. Costs a system call until one has come.
    static int Received() noexcept;
    // Throws Interrupted when one came.
    static void Check();

private:
    EventLoop loop_;
    std::vector<EventSource> sources_;
    int received_ = 0;
};

} // namespace kelo::tool
