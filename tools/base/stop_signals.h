#pragma once

#include <csignal>
#include <exception>

namespace kelo::tool {

// The user or the service manager asked the program to stop; what was half done has been undone.
struct Interrupted : std::exception {
    explicit Interrupted(int by) : signal(by) {}
    int signal;
};

// While the object lives, INT, TERM and HUP only leave a mark, so that the work can end tidily. One object at
// a time.
class StopSignals {
public:
    StopSignals();
    // The signals do again what they did before.
    ~StopSignals();
    StopSignals(const StopSignals &) = delete;
    StopSignals &operator=(const StopSignals &) = delete;

    // The signal that came, 0 for none so far.
    static int Received();
    // Throws Interrupted when one came.
    static void Check();

private:
    static constexpr int kSignals[] = {SIGINT, SIGTERM, SIGHUP};
    struct sigaction before_[3];
};

} // namespace kelo::tool
