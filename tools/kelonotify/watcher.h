#pragma once

#include "base/event_loop.h"
#include "base/files.h"

namespace kelo::tool {

// Tells when there is something to do, and when to stop. While an object lives, SIGTERM and SIGINT end
// nothing by themselves.
class Watcher {
public:
    // Watches the folder. Throws SpoolError, and std::system_error as the other functions do.
    explicit Watcher(const std::string &folder);

    // Waits until a file appears in the folder, a signal asks to stop, or the seconds are over (below 0: no
    // end). What appeared since the last wait ends it at once.
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
