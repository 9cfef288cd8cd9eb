#pragma once

#include <string>

namespace kelo::tool {

// Notifies the administrator when the volume of a folder is full: one event and one notification each time.
// If they cannot be stored because the volume is full, they are sent when there is room again.
class DiskSpaceMonitor {
public:
    // `folder` is the absolute path that the notification names.
    explicit DiskSpaceMonitor(std::string folder) : folder_(std::move(folder)) {}

    // Something could not be written because there was no space.
    void NoteFull();
    // It could be written.
    void NoteWritten();

    // Checks the free space; call it every few seconds.
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
