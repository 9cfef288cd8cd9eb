#pragma once

#include <string>

namespace kelo::tool {

// Tells the administrator when the volume of a folder is full: one event and one notification each time it
// becomes so. What cannot be told because the volume is full is told when there is room again.
class DiskSpaceMonitor {
public:
    // `folder` is the absolute path that the notification names.
    explicit DiskSpaceMonitor(std::string folder) : folder_(std::move(folder)) {}

    // Something could not be written for want of space.
    void NoteFull();
    // It could be written.
    void NoteWritten();

    // Looks at the free space; to be called every few seconds.
    void Tick();

private:
    void Enter(bool &cause);
    void Leave(bool &cause);
    void Tell();

    std::string folder_;
    bool isWriteFailing_ = false;
    bool isSpaceLow_ = false;
    bool isEventDue_ = false;
    bool isNotificationDue_ = false;
};

} // namespace kelo::tool
