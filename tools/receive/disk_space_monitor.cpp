#include "receive/disk_space_monitor.h"

#include <syslog.h>

#include <cstdint>

#include "base/volumes.h"
#include "kelosyslog/logger.h"
#include "kelosyslog/notification.h"

namespace kelo::tool {
namespace {

// From here on a volume that was full is not. Between the two limits nothing changes, so that a volume near
// the limit causes no series of events.
constexpr uint64_t kRoomBytes = 2 * VolumeStatus::kFullBytes;
constexpr std::chrono::seconds kRetry{30}; // each try may wait for a lock

} // namespace

DiskSpaceMonitor::DiskSpaceMonitor(const std::string &root, std::string folder)
    : root_(root), folder_(std::move(folder)), reserve_(root) {}

std::string DiskSpaceMonitor::NameOfVolume() const {
    return VolumeOf(root_, folder_).folders.front();
}

void DiskSpaceMonitor::NoteFull() {
    Tick();
    Set(NameOfVolume(), &Volume::isWriteFailing, true);
}

void DiskSpaceMonitor::NoteWritten() {
    Tick(); // a little may fit in although the volume is still full
    Set(NameOfVolume(), &Volume::isWriteFailing, false);
}

void DiskSpaceMonitor::Tick() {
    for (const VolumeStatus &status : GatherVolumes(root_, folder_)) {
        const std::string &name = status.folders.front();
        if (status.FreeLevel() == VolumeStatus::Level::Full)
            Set(name, &Volume::isSpaceLow, true);
        else if (status.free >= kRoomBytes)
            Set(name, &Volume::isSpaceLow, false);
    }
    bool isAnyFull = false;
    for (auto &[name, volume] : volumes_) {
        if (Clock::now() >= volume.retryTime)
            Tell(name, volume);
        isAnyFull = isAnyFull || volume.IsFull();
    }
    if (!isAnyFull)
        reserve_.Hold();
}

void DiskSpaceMonitor::Set(const std::string &name, bool Volume::*cause, bool value) {
    Volume &volume = volumes_[name];
    const bool wasFull = volume.IsFull();
    volume.*cause = value;
    if (volume.IsFull() == wasFull)
        return;
    if (wasFull) {
        syslog(LOG_NOTICE, "the volume of %s has room again", name.c_str());
    } else {
        syslog(LOG_ERR, "the volume of %s is full", name.c_str());
        volume.isEventDue = true;
        volume.isNotificationDue = true;
        reserve_.ReleaseForEvent();
    }
    Tell(name, volume);
}

void DiskSpaceMonitor::Tell(const std::string &name, Volume &volume) {
    if (volume.isEventDue)
        volume.isEventDue = Logger().LogAddVolFull() != 0;
    const auto fails = [&] { return NotificationManager().NotificationSendVolFull(name) != 0; };
    if (volume.isNotificationDue && fails()) {
        reserve_.ReleaseForNotification();
        volume.isNotificationDue = fails();
    } else {
        volume.isNotificationDue = false;
    }
    volume.retryTime = Clock::now() + kRetry;
}

} // namespace kelo::tool
