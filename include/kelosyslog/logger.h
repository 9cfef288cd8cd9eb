#pragma once

// The log server's own event log: starts, stops, archives, cleared logs, and rules that fired.
//
//     Logger logger;
//     logger.LogAddServStart("1.0");
//     for (const _SSYSLOG_LOG_LOG_tag &event : logger.LogEnum("/usr/kelo/etc/kelosyslog.db", 0, 50))
//         printf("%s\n", event.event.c_str());
//
// Threads: a Logger may be used from any thread, and by several at a time. It holds no state: every operation
// opens its database, works and closes it. Operations return 0 or -1 unless stated otherwise, and report a
// failure in the system log. Silent are LogHtmlGen and LogHtmlRemove, a LogCount of -2, and in LogClear a
// file that could not be deleted. When memory runs out they throw std::bad_alloc, with everything closed.

#include <cstdint>
#include <list>
#include <string>

#include "kelosyslog/export.h"
#include "kelosyslog/records.h"

// One event.
struct _SSYSLOG_LOG_LOG_tag {
    int32_t id = 0;
    int32_t level = 0; // 0 Information, 1 Warning, 2 Error
    int64_t time = 0;  // seconds since the epoch
    std::string user;
    std::string event;
};

class KELOSYSLOG_API Logger {
public:
    // Appends an event at the present time to the database at `dbPath`, which is created when missing, and
    // rotates that database. 0 means that the event is in the file. A failed rotation is reported but does
    // not change the result: the event stays.
    int LogAdd(std::string dbPath, int level, std::string user, std::string event) const;

    // Append an event of user "SYSTEM" to the server's own event database.
    int LogAddServStart(std::string text) const;
    int LogAddServStop(std::string text) const;
    int LogAddNotifyEps(uint64_t eps) const;
    int LogAddNotifySev(std::string sev, std::string content) const;
    int LogAddNotifySev(_SYSLOG_DB_PRIORITY_tag prio, std::string content) const;
    int LogAddNotifySev(int, std::string) const = delete; // 0 would be taken for a null text
    int LogAddNotifyKw(std::string keyword, std::string content) const;
    int LogAddArchStart(std::string dbName) const;
    int LogAddArchFinish(std::string dbName) const;
    int LogAddArchFailed(std::string dbName) const;
    int LogAddVolFull() const;
    // Records that `user` cleared the log database at `dbPath`.
    int LogAddLogClear(std::string dbPath, std::string user) const;

    // Deletes the log database file at `dbPath` and records that, also when there is no such file or it
    // cannot be deleted, which is not reported. Always 0.
    int LogClear(std::string dbPath, std::string user) const;

    // Number of events in the database at the absolute path `dbPath`; -1 on failure, -2 when the statement
    // did not yield exactly one row (not reported).
    int LogCount(std::string dbPath) const;

    // Rotates a database of 20,000 events or more: removes events whose time is 0 or less, and compacts the
    // file. Smaller ones do not change.
    int LogRotation(std::string dbPath) const;

    // The events of the database at `dbPath`, newest first: `limit` of them after `offset`, or all when
    // `limit` is 0. Empty on failure.
    std::list<_SSYSLOG_LOG_LOG_tag> LogEnum(std::string dbPath, int offset, int limit) const;

    // Writes all events of the database at `dbPath`, newest first and in local time, as an HTML page to
    // `outPath`, created or truncated. Users and events are written unchanged, without escaping. `second`
    // only has to be non-empty.
    //
    // Returns -1 for an empty argument, else 0: also when there are no events (no file is written), when
    // `outPath` cannot be opened and when it takes only a part of the page (a full disk).
    int LogHtmlGen(std::string dbPath, std::string second, std::string outPath) const;

    // Deletes the file at `path`. Returns -1 for an empty path or when it could not be deleted.
    int LogHtmlRemove(std::string path) const;
};

// Name of an event level, 0 to 2; "" for any other.
KELOSYSLOG_API std::string strLevelGet(int level);

// Copies the name of an event level to `buffer`, cut to `size` bytes with the terminator. Returns 0, or -1
// for a null buffer.
KELOSYSLOG_API int szLevelGet(int level, char *buffer, int size);
