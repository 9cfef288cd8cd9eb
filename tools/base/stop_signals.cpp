#include "base/stop_signals.h"

#include <csignal>

namespace kelo::tool {
namespace {

StopSignals *current = nullptr;

bool IsIgnored(int signal) {
    struct sigaction action {};
    return sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
}

} // namespace

StopSignals::StopSignals() {
    for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
        if (!IsIgnored(signal))
            sources_.push_back(loop_.AddSignal(signal, [this, signal] { received_ = signal; }));
    }
    current = this;
}

StopSignals::~StopSignals() {
    current = nullptr;
}

int StopSignals::Received() noexcept {
    if (current == nullptr)
        return 0;
    if (current->received_ == 0)
        current->loop_.Poll();
    return current->received_;
}

void StopSignals::Check() {
    if (const int signal = Received(); signal != 0)
        throw Interrupted(signal);
}

} // namespace kelo::tool
