#include "retention/retention_run.h"

#include <syslog.h>

#include <algorithm>
#include <ctime>

#include "archive/retention.h"
#include "base/errors.h"
#include "base/time_format.h"
#include "kelosyslog/notification.h"
#include "read/event_log.h"
#include "read/log_table.h"
#include "retention/retention_state.h"

namespace kelo::tool {
namespace {

using WhenFull = RetentionRule::WhenFull;

// Between the least free space and this part above it nothing changes, so that a volume near it causes no
// series of events and reloads.
constexpr uint64_t kMarginDivisor = 4;

std::string RecordsText(uint64_t count) {
    return std::to_string(count) + (count == 1 ? " record" : " records");
}

} // namespace

RetentionRun::RetentionRun(const std::string &root, RetentionRule rule, VolumeStatus volume, bool isDryRun,
                           std::function<void(const std::string &)> report)
    : root_(root), rule_(std::move(rule)), volume_(std::move(volume)), report_(std::move(report)),
      reception_(root),
      log_(ResolveLogTable({}, root).path, isDryRun ? SqliteMode::kRead : SqliteMode::kWrite) {
    if (rule_.keepSec > 0)
        since_ = std::time(nullptr) - rule_.keepSec;
}

std::string RetentionRun::FreeText(const Room &room) const {
    return volume_.folders.front() + " has " + FormatSize(volume_.free) + " free and " +
           FormatSize(room.reusable) + " in the log that new records can use";
}

bool RetentionRun::IsLow(const Room &room) const {
    return rule_.whenFull != WhenFull::kNothing && FreeWith(room) < rule_.minFreeBytes;
}

uint64_t RetentionRun::Excess(const Room &room) const {
    const uint64_t tooLarge =
        rule_.keepBytes > 0 && room.used > rule_.keepBytes ? room.used - rule_.keepBytes : 0;
    const bool isLow = rule_.whenFull == WhenFull::kRemove && IsLow(room);
    return std::max(tooLarge, isLow ? rule_.minFreeBytes - FreeWith(room) : 0);
}

bool RetentionRun::HasEnough(const Room &room) const {
    return FreeWith(room) >= rule_.minFreeBytes + rule_.minFreeBytes / kMarginDivisor;
}

// A clock that is wrong makes all records old, and a volume that something else fills asks for all of them.
void RetentionRun::RefuseToRemoveAll() {
    const int64_t newest = log_.NewestSec();
    if (since_ > 0 && newest > 0 && newest < since_)
        throw DatabaseError("keep=\"" + rule_.keep + "\" would remove every record: the newest is of " +
                            TimeFormat(false).Plain(newest) + "; is the clock right?");
    const Room room = log_.Measure();
    if (rule_.whenFull == WhenFull::kRemove && IsLow(room) &&
        rule_.minFreeBytes - FreeWith(room) > room.used / 2)
        throw DatabaseError("min_free=\"" + rule_.minFree +
                            "\" would remove more than half of the records, which take " +
                            FormatSize(room.used) + ": " + FreeText(room));
}

std::vector<std::string> RetentionRun::Plan() {
    RefuseToRemoveAll();
    std::vector<std::string> lines;
    const int64_t old = since_ > 0 ? log_.CountBefore(since_) : 0;
    if (old > 0)
        lines.push_back("remove " + RecordsText(static_cast<uint64_t>(old)) + " of before " +
                        TimeFormat(false).Plain(since_));
    const Room room = log_.Measure();
    const uint64_t excess = Excess(room);
    if (excess > 0)
        lines.push_back("remove the oldest records, " + FormatSize(excess) + " of " + FormatSize(room.used) +
                        (old > 0 ? " together with these" : ""));
    const bool hasTo = rule_.whenFull == WhenFull::kStop && IsLow(room);
    if (hasTo && !reception_.IsStopped())
        lines.push_back("stop receiving: " + FreeText(room));
    if (reception_.IsStopped() && (rule_.whenFull != WhenFull::kStop || HasEnough(room)))
        lines.push_back("receive again");
    return lines;
}

bool RetentionRun::RemoveRecords() {
    bool hasRemoved = false;
    const auto report = [&](uint64_t count, const std::string &which) {
        if (count > 0)
            report_("removed " + RecordsText(count) + which);
        hasRemoved = hasRemoved || count > 0;
    };
    if (since_ > 0)
        report(log_.RemoveBefore(since_), " of before " + TimeFormat(false).Plain(since_));
    report(log_.RemoveOldest([this](const Room &room) { return Excess(room); }), ", the oldest");
    return hasRemoved;
}

void RetentionRun::ReportLowVolume(bool isLow) const {
    syslog(isLow ? LOG_ERR : LOG_NOTICE, "the volume of %s has %s", volume_.folders.front().c_str(),
           isLow ? "too little free space for the rule of retention" : "enough free space again");
    if (!isLow)
        return;
    const std::string reason = AddEvent(root_, [](Logger &logger) { return logger.LogAddVolFull(); });
    if (!reason.empty())
        syslog(LOG_ERR, "cannot add the event of this: %s", reason.c_str());
    NotificationManager().NotificationSendVolFull(volume_.folders.front());
}

bool RetentionRun::Execute() {
    RetentionState state = ReadRetentionState(root_);
    const Room before = log_.Measure();
    const bool wasLow = state.isLow;
    state.isLow = IsLow(before) || (wasLow && !HasEnough(before));
    if (state.isLow != wasLow) {
        WriteRetentionState(root_, state);
        ReportLowVolume(state.isLow);
    }
    RefuseToRemoveAll();
    bool hasDone = RemoveRecords();
    const Room room = log_.Measure();
    if (rule_.whenFull == WhenFull::kStop && IsLow(room)) {
        if (reception_.Stop()) {
            report_("stopped receiving");
            hasDone = true;
        }
    } else if ((rule_.whenFull != WhenFull::kStop || HasEnough(room)) && reception_.Resume()) {
        report_("receiving again");
        hasDone = true;
    }
    return hasDone;
}

} // namespace kelo::tool
