#include "receive/disk_space_monitor.h"

#include <sys/statvfs.h>
#include <syslog.h>

#include <cstdint>

#include "kelosyslog/logger.h"
#include "kelosyslog/notification.h"

namespace kelo::tool {
namespace {

// Below the first value the volume is full, from the second on it is not. Between them nothing changes, so
// that a volume near the limit causes no series of events.
constexpr uint64_t kFullBytes = 16 * 1024 * 1024;
constexpr uint64_t kRoomBytes = 32 * 1024 * 1024;

} // namespace

void DiskSpaceMonitor::NoteFull() {
    Enter(isWriteFailing_);
}

void DiskSpaceMonitor::NoteWritten() {
    Leave(isWriteFailing_);
}

void DiskSpaceMonitor::Tick() {
    struct statvfs status {};
    if (statvfs(folder_.c_str(), &status) != 0)
        return;
    const uint64_t freeBytes = uint64_t{status.f_bavail} * status.f_frsize;
    if (freeBytes < kFullBytes)
        Enter(isSpaceLow_);
    else if (freeBytes >= kRoomBytes)
        Leave(isSpaceLow_);
}

void DiskSpaceMonitor::Enter(bool &cause) {
    const bool wasFull = isWriteFailing_ || isSpaceLow_;
    cause = true;
    if (wasFull)
        return;
    syslog(LOG_ERR, "the volume of %s is full", folder_.c_str());
    isEventDue_ = true;
    isNotificationDue_ = true;
    Tell();
}

void DiskSpaceMonitor::Leave(bool &cause) {
    const bool wasFull = isWriteFailing_ || isSpaceLow_;
    cause = false;
    if (!wasFull || isWriteFailing_ || isSpaceLow_)
        return;
    syslog(LOG_NOTICE, "the volume of %s has room again", folder_.c_str());
    Tell();
    isEventDue_ = false;
    isNotificationDue_ = false;
}

void DiskSpaceMonitor::Tell() {
    if (isEventDue_)
        isEventDue_ = Logger().LogAddVolFull() != 0;
    if (isNotificationDue_)
        isNotificationDue_ = NotificationManager().NotificationSendVolFull(folder_) != 0;
}

} // namespace kelo::tool
