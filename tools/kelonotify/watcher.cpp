#include "kelonotify/watcher.h"

#include <poll.h>
#include <sys/inotify.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>

#include "spool/spool.h"

namespace kelo::tool {

Watcher::Watcher(const std::string &folder) : files_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    sigaddset(&signals, SIGINT);
    sigprocmask(SIG_BLOCK, &signals, nullptr);
    signals_ = FileHandle(signalfd(-1, &signals, SFD_NONBLOCK | SFD_CLOEXEC));
    if (!files_ || !signals_ || inotify_add_watch(files_.Get(), folder.c_str(), IN_MOVED_TO | IN_CREATE) < 0)
        throw SpoolError(folder + ": " + std::strerror(errno));
}

void Watcher::Wait(int64_t seconds) {
    constexpr int64_t kLongestSec = 3600;
    const int64_t timeoutSec = seconds < 0 ? kLongestSec : std::clamp<int64_t>(seconds, 1, kLongestSec);
    pollfd waiting[2] = {{files_.Get(), POLLIN, 0}, {signals_.Get(), POLLIN, 0}};
    poll(waiting, 2, static_cast<int>(timeoutSec) * 1000);
    alignas(inotify_event) char events[4096];
    while (read(files_.Get(), events, sizeof events) > 0) {
    }
}

bool Watcher::ShouldStop() {
    signalfd_siginfo signal;
    if (read(signals_.Get(), &signal, sizeof signal) > 0)
        isStopped_ = true;
    return isStopped_;
}

} // namespace kelo::tool
