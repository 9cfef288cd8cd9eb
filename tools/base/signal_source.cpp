#include "base/signal_source.h"

#include <sys/signalfd.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <system_error>

namespace kelo::tool {

SignalSource::SignalSource() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int signal : {SIGHUP, SIGTERM, SIGINT})
        sigaddset(&signals, signal);
    sigprocmask(SIG_BLOCK, &signals, nullptr);
    file_ = FileHandle(signalfd(-1, &signals, SFD_NONBLOCK | SFD_CLOEXEC));
    if (!file_)
        throw std::system_error(errno, std::generic_category(), "signals");
}

std::optional<int> SignalSource::Take() {
    signalfd_siginfo signal{};
    if (read(file_.Get(), &signal, sizeof signal) != sizeof signal)
        return std::nullopt;
    return static_cast<int>(signal.ssi_signo);
}

} // namespace kelo::tool
