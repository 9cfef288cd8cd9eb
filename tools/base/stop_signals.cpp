#include "base/stop_signals.h"

namespace kelo::tool {
namespace {

volatile std::sig_atomic_t received = 0;

void Note(int signal) {
    received = signal;
}

} // namespace

StopSignals::StopSignals() {
    struct sigaction action {};
    action.sa_handler = Note;
    sigemptyset(&action.sa_mask);
    action.sa_flags = SA_RESTART;
    for (size_t i = 0; i < 3; ++i) {
        sigaction(kSignals[i], nullptr, &before_[i]);
        if (before_[i].sa_handler != SIG_IGN) // for example HUP under nohup
            sigaction(kSignals[i], &action, nullptr);
    }
}

StopSignals::~StopSignals() {
    for (size_t i = 0; i < 3; ++i)
        sigaction(kSignals[i], &before_[i], nullptr);
    received = 0;
}

int StopSignals::Received() {
    return received;
}

void StopSignals::Check() {
    if (received != 0)
        throw Interrupted(received);
}

} // namespace kelo::tool
