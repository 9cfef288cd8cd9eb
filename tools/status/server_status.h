#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

#include "base/volumes.h"
#include "status/accounting.h"
#include "status/databases.h"
#include "status/message_spool.h"
#include "status/network.h"
#include "status/notifications.h"
#include "status/receiver.h"
#include "status/recent_events.h"
#include "status/retention.h"
#include "status/syslog_ng.h"

namespace kelo::tool {

// The data of `kelosyslog status` at one moment.
struct ServerStatus {
    int64_t time = 0; // seconds since the epoch, as all times
    SyslogNgStatus syslogNg;
    NetworkStatus network;
    ReceiverStatus receiver;
    MessageSpoolStatus messageSpool;
    std::vector<DatabaseStatus> databases;
    ArchiveStatus archives;
    RetentionStatus retention;
    std::optional<AccountingStatus> accounting; // nothing without a database that can be read
    NotificationStatus notifications;
    std::vector<Event> events; // newest first
    std::vector<VolumeStatus> volumes;
    std::vector<std::string> folderProblems; // of folders that syslog-ng or the receiver stores into

    // What needs attention, one line each, in the order of the screen; empty for nothing.
    std::vector<std::string> attention;
};

struct StatusOptions {
    std::string root;                        // absolute or empty
    std::string control;                     // another control socket of syslog-ng
    std::chrono::milliseconds timeout{2000}; // with syslog-ng
};

// Collects everything. Throws nothing but std::bad_alloc: what is unknown is part of the status.
ServerStatus GatherStatus(const StatusOptions &options);

// What needs attention of a status whose other members are filled.
std::vector<std::string> FindAttention(const ServerStatus &status);

} // namespace kelo::tool
