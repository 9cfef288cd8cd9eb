#pragma once

#include <chrono>
#include <map>
#include <string>

#include "receive/space_reserve.h"

namespace kelo::tool {

// Notifies the administrator when one of the system's volumes is full: one event and one notification each
// time. They find room in a reserve that is given up for them; if they cannot be stored nevertheless, they
// are tried again until they are.
class DiskSpaceMonitor {
public:
    // `folder` is the absolute path that NoteFull is about; `root` is that of the system's files.
    DiskSpaceMonitor(const std::string &root, std::string folder);

    // Something could not be written into the folder because there was no space.
    void NoteFull();
    // It could be written.
    void NoteWritten();

    // Checks the free space; call it every few seconds.
    void Tick();

private:
    using Clock = std::chrono::steady_clock;

    // Of a volume, which is known by one of its folders.
    struct Volume {
        bool isWriteFailing = false;
        bool isSpaceLow = false;
        bool isEventDue = false;
        bool isNotificationDue = false;
        Clock::time_point retryTime;

        bool IsFull() const { return isWriteFailing || isSpaceLow; }
    };

    void Set(const std::string &name, bool Volume::*cause, bool value);
    void Tell(const std::string &name, Volume &volume);
    std::string NameOfVolume() const;

    std::string root_;
    std::string folder_;
    SpaceReserve reserve_;
    std::map<std::string, Volume> volumes_;
};

} // namespace kelo::tool
