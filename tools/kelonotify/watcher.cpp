#include "kelonotify/watcher.h"

#include <sys/inotify.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>

#include "spool/spool.h"

namespace kelo::tool {

Watcher::Watcher(const std::string &folder) : files_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    if (!files_ || inotify_add_watch(files_.Get(), folder.c_str(),
                                     IN_MOVED_TO | IN_CREATE | IN_ONLYDIR | IN_DONT_FOLLOW) < 0)
        throw SpoolError(folder + ": " + std::strerror(errno));
    news_ = loop_.AddInput(files_.Get(), [this] { TakeNews(); });
    term_ = loop_.AddSignal(SIGTERM, [this] { isStopped_ = true; });
    interrupt_ = loop_.AddSignal(SIGINT, [this] { isStopped_ = true; });
}

void Watcher::TakeNews() {
    alignas(inotify_event) char events[4096];
    while (read(files_.Get(), events, sizeof events) > 0) {
    }
    hasNews_ = true;
}

void Watcher::Wait(int64_t seconds) {
    constexpr int64_t kLongestSec = 3600;
    const std::chrono::seconds pause(seconds < 0 ? kLongestSec
                                                 : std::clamp<int64_t>(seconds, 1, kLongestSec));
    bool isOver = false;
    EventSource timer = loop_.AddTimer([&] { isOver = true; });
    timer.FireAt(std::chrono::steady_clock::now() + pause);
    while (!isOver && !hasNews_ && !isStopped_)
        loop_.Wait();
    hasNews_ = false;
}

bool Watcher::ShouldStop() {
    while (loop_.Poll()) {
    }
    return isStopped_;
}

} // namespace kelo::tool
