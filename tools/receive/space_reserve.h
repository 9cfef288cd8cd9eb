#pragma once

#include <string>

namespace kelo::tool {

// Disk space that is kept for the day when the volume is full: a file in the folder of the event log and one
// in the spool of notifications. Removing them makes room for an event and a notification. kelonotify removes
// the second one when it needs room for a delivery.
class SpaceReserve {
public:
    // Of the system's files below `root`. Creates nothing yet.
    explicit SpaceReserve(std::string root) : root_(std::move(root)) {}

    // Creates the files that are missing. Where that fails there is no reserve.
    void Hold() const;
    void ReleaseForEvent() const;
    void ReleaseForNotification() const;

private:
    std::string root_;
};

} // namespace kelo::tool
