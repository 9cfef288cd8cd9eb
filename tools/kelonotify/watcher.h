#pragma once

#include "base/event_loop.h"
#include "base/files.h"

namespace kelo::tool {

// Waits for work and for a request to stop. During the lifetime of an object SIGTERM and SIGINT do not end
// the process.
class Watcher {
public:
    // Watches the folder. Throws SpoolError, and std::system_error as the other functions do.
    explicit Watcher(const std::string &folder);

    // Waits until a file appears in the folder, a signal asks to stop, or the seconds are over (below 0: no
    // limit). It returns immediately for a file that appeared since the last wait.
    void Wait(int64_t seconds);

    // Whether a signal asked to stop.
    bool ShouldStop();

private:
    void TakeNews();

    FileHandle files_;
    bool hasNews_ = false;
    bool isStopped_ = false;
    EventLoop loop_;
    EventSource news_;
    EventSource term_;
    EventSource interrupt_;
};

} // namespace kelo::tool
