#pragma once

#include "base/files.h"

namespace kelo::tool {

// Tells when there is something to do, and when to stop. While an object lives, SIGTERM and SIGINT end
// nothing by themselves.
class Watcher {
public:
    // Watches the folder. Throws SpoolError.
    explicit Watcher(const std::string &folder);

    // Waits until a file appears in the folder, a signal asks to stop, or the seconds are over (below 0: no
    // end). What appeared since the last wait ends it at once.
    void Wait(int64_t seconds);

    // Whether a signal asked to stop.
    bool ShouldStop();

private:
    FileHandle files_;
    FileHandle signals_;
    bool isStopped_ = false;
};

} // namespace kelo::tool
