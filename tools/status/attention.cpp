// The parts of a status that need attention.

#include <algorithm>

#include "status/figures.h"
#include "status/server_status.h"
#include "status/state_names.h"

namespace kelo::tool {
namespace {

constexpr int64_t kLongestWaitSec = 3600; // the longest pause between two attempts

using Points = std::vector<std::string>;

void LookAtSyslogNg(const SyslogNgStatus &status, Points &lines) {
    using State = SyslogNgStatus::State;
    if (status.state == State::Stopped)
        lines.push_back("syslog-ng is not running (" + status.control + ": " + status.problem + ")");
    else if (status.state == State::Silent)
        lines.push_back("syslog-ng runs and does not answer (" + status.control + ": " + status.problem +
                        ")");
    else if (status.state == State::Unknown)
        lines.push_back("cannot tell whether syslog-ng runs (" + status.control + ": " + status.problem +
                        ")");
    for (const SyslogNgCounters &destination : status.destinations) {
        if (destination.dropped > 0)
            lines.push_back("syslog-ng dropped " + Counted(destination.dropped, "message") + " for " +
                            destination.id + " (" + destination.instance + ")");
    }
}

// Messages that wait and do not become records, with the time since the newest record.
void LookAtQueues(const ServerStatus &status, Points &lines) {
    constexpr uint64_t kManyMessages = 1000;
    constexpr int64_t kLongSec = 60;
    const std::string &ofReceiver = status.receiver.told.database;
    std::optional<int64_t> newest;
    for (const DatabaseStatus &database : status.databases) {
        if (ofReceiver.empty() ? database.name == "logs" : database.path == ofReceiver)
            newest = database.last;
    }
    for (const SyslogNgCounters &destination : status.syslogNg.destinations) {
        const bool isLong = !newest || status.time - *newest > kLongSec;
        if (destination.isStuck && (isLong || destination.queued >= kManyMessages))
            lines.push_back(
                "syslog-ng cannot write " + Counted(destination.queued, "message") + " for " +
                destination.id + " (" + destination.instance + ")" +
                (newest ? "; the newest record is " + Duration(status.time - *newest) + " old" : ""));
    }
}

void LookAtReceiver(const ReceiverStatus &status, int64_t now, Points &lines) {
    using State = ReceiverStatus::State;
    const std::string pid = std::to_string(status.told.pid);
    if (status.state == State::Died)
        lines.push_back("the receiver died: process " + pid + " is gone and did not end in order");
    else if (status.state == State::Silent)
        lines.push_back("the receiver (process " + pid + ") has told nothing of itself for " +
                        Duration(now - status.told.updated));
    else if (status.state == State::Unreadable)
        lines.push_back("cannot tell whether the receiver runs: " + status.path + " cannot be read");
    if (status.told.lostNotifications > 0)
        lines.push_back("the receiver gave up " + Counted(status.told.lostNotifications, "notification") +
                        ", as the spool had no room");
    if (status.told.others > 0)
        lines.push_back(Counted(status.told.others, "record") +
                        " came from more devices than are counted by name (kelosyslog stats forget)");
    if ((status.state == State::Running || status.state == State::Silent) && !status.told.waiting.empty())
        lines.push_back("the receiver waits: " + status.told.waiting);
}

// Whether nothing reads the message spool although syslog-ng writes it.
bool LookAtUnreadSpool(const ServerStatus &status, Points &lines) {
    using State = ReceiverStatus::State;
    const MessageSpoolStatus &spool = status.messageSpool;
    const std::string &folder = spool.folder.empty() ? status.receiver.told.spool.folder : spool.folder;
    const State state = status.receiver.state;
    if (folder.empty() || (state != State::None && state != State::Stopped))
        return false;
    lines.push_back("the receiver " + std::string(state == State::None ? "never ran" : "is stopped") +
                    ": messages wait in " + folder +
                    (spool.bytes ? " (" + Bytes(static_cast<int64_t>(*spool.bytes)) + ")" : "") +
                    "; does kelosyslog-receive run?");
    return true;
}

void LookAtSpool(const ServerStatus &status, Points &lines) {
    constexpr int64_t kLongSec = 60;
    if (LookAtUnreadSpool(status, lines))
        return;
    const ReceiverState::Spool &spool = status.receiver.told.spool;
    const auto lasts = spool.LastsSec();
    if (spool.limit > 0 && spool.bytes >= spool.limit)
        lines.push_back(spool.folder + " is full: senders over TCP have to wait");
    else if (spool.behindSec >= kLongSec)
        lines.push_back("the receiver is " + Duration(spool.behindSec) + " behind" +
                        (lasts ? "; " + spool.folder + " is full in " + Duration(*lasts) : ""));
}

// With kelo_store "cluster" of kelosyslog.conf there is no working log.
bool OnlyClusterStores(const SyslogNgStatus &status) {
    return std::any_of(
        status.destinations.begin(), status.destinations.end(),
        [](const SyslogNgCounters &destination) { return destination.id.starts_with("d_kelo_cluster#"); });
}

void LookAtDatabases(const ServerStatus &status, Points &lines) {
    using State = DatabaseStatus::State;
    const std::string &ofReceiver = status.receiver.told.database;
    const bool isCluster = OnlyClusterStores(status.syslogNg);
    for (const DatabaseStatus &database : status.databases) {
        // The accounting and event databases are created with their first content. The working log must exist
        // unless the receiver or a cluster stores instead.
        const bool isMissed =
            (database.name == "logs" && ofReceiver.empty() && !isCluster) || database.path == ofReceiver;
        if (database.state == State::Damaged)
            lines.push_back("database " + database.name + " is damaged: " + database.problem);
        else if (database.state == State::Locked)
            lines.push_back("database " + database.name + " is locked: " + database.problem);
        else if (database.state == State::Unreadable || (database.state == State::Missing && isMissed))
            lines.push_back("database " + database.name + ": " + database.problem);
        if (database.quarantined)
            lines.push_back("a damaged database was put aside: " + database.path + ".corrupt (" +
                            Bytes(*database.quarantined) + ")");
    }
    if (!status.archives.problem.empty())
        lines.push_back("archives: " + status.archives.problem);
}

void LookAtRetention(const ServerStatus &status, Points &lines) {
    constexpr int64_t kDaySec = 86400;
    const RetentionStatus &retention = status.retention;
    if (!retention.problem.empty())
        lines.push_back("the rule of retention is not followed: " + retention.problem);
    if (retention.isReceptionStopped)
        lines.push_back("receiving is stopped, as the rule of retention says for a volume that fills");
    for (const DatabaseStatus &database : status.databases) {
        if (database.name == "logs" && retention.problem.empty() && retention.rule &&
            retention.rule->keepSec > 0 && database.first &&
            status.time - *database.first > retention.rule->keepSec + kDaySec)
            lines.push_back("records are " + Duration(status.time - *database.first) +
                            " old and the rule of retention keeps " + retention.rule->keep +
                            "; does kelosyslog-retention.timer run?");
    }
}

void LookAtNotifications(const NotificationStatus &status, int64_t now, Points &lines) {
    if (!status.problem.empty())
        lines.push_back("notifications: " + status.problem);
    if (status.failed > 0)
        lines.push_back("given up: " + Counted(status.failed, "notification") + " (kelosyslog notify list)");
    if (status.oldest != 0 && now - status.oldest > kLongestWaitSec)
        lines.push_back("a notification has waited for " + Duration(now - status.oldest) +
                        "; does kelonotify run?");
    for (const ChannelHealth &channel : status.channels) {
        if (!channel.problem.empty())
            lines.push_back("channel " + channel.name + " fails: " + channel.problem);
    }
}

} // namespace

std::vector<std::string> FindAttention(const ServerStatus &status) {
    Points lines;
    LookAtSyslogNg(status.syslogNg, lines);
    LookAtQueues(status, lines);
    for (std::string &line : FindNetworkProblems(status.network, status.syslogNg))
        lines.push_back(std::move(line));
    LookAtReceiver(status.receiver, status.time, lines);
    LookAtSpool(status, lines);
    lines.insert(lines.end(), status.folderProblems.begin(), status.folderProblems.end());
    LookAtDatabases(status, lines);
    LookAtRetention(status, lines);
    LookAtNotifications(status.notifications, status.time, lines);
    for (const VolumeStatus &volume : status.volumes) {
        if (volume.FreeLevel() != VolumeStatus::Level::Good)
            lines.push_back("the volume of " + volume.folders.front() + " is " +
                            StateName(volume.FreeLevel()) + ": " + Bytes(static_cast<int64_t>(volume.free)) +
                            " free of " + Bytes(static_cast<int64_t>(volume.size)));
    }
    return lines;
}

} // namespace kelo::tool
