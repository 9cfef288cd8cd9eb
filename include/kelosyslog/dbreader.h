#pragma once

// Searching and counting on a connection that the program keeps.
//
//     SyslogDBReader reader("/var/log/kelosyslog/logs.db");
//     const SyslogDBSnapshot snapshot(reader); // the rows and their number fit together
//     const int total = reader.SelectCount(conditions, nullptr, nullptr);
//     reader.Select(conditions, &page, nullptr, PrintLog, nullptr, false);
//
// The statements, results and messages are those of SyslogDBSelectByTable and SyslogDBSelectCountByTable
// (dbutil.h), which open a connection for each call: that costs several times as much as a small page itself.
//
// Threads: a reader is used by one thread at a time; give each thread one of its own. Reasons of failures are
// in failure.h. When memory runs out outside the database layer the functions throw std::bad_alloc.

#include <list>
#include <string>

#include "kelosyslog/dbutil.h"
#include "kelosyslog/export.h"

struct DBConnect_tag;

class KELOSYSLOG_API SyslogDBReader {
public:
    // `dbPath` is absolute. Nothing is opened before the first search.
    explicit SyslogDBReader(std::string dbPath);
    // Closes the connection, which ends a snapshot.
    ~SyslogDBReader();
    SyslogDBReader(const SyslogDBReader &) = delete;
    SyslogDBReader &operator=(const SyslogDBReader &) = delete;

    // As SyslogDBSelectByTable and SyslogDBSelect.
    //
    // Each search connects where that is needed: at the first one, after a failed connection, and, outside of
    // a snapshot, when the file was moved or removed and another one may have its name. The callback may not
    // use this reader.
    int SelectByTable(const std::string &table, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                      const _SYSLOG_SQL_LIMIT_tag *limit, const _SYSLOG_SQL_ORDER_tag *order,
                      SyslogDBRowCallback callback, void *context, bool trimUser);
    int Select(const std::list<_SYSLOG_SQL_COND_tag> &conditions, const _SYSLOG_SQL_LIMIT_tag *limit,
               const _SYSLOG_SQL_ORDER_tag *order, SyslogDBRowCallback callback, void *context,
               bool trimUser);

    // As SyslogDBSelectCountByTable and SyslogDBSelectCount.
    int SelectCountByTable(const std::string &table, const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                           const _SYSLOG_SQL_LIMIT_tag *limit, const _SYSLOG_SQL_ORDER_tag *order);
    int SelectCount(const std::list<_SYSLOG_SQL_COND_tag> &conditions, const _SYSLOG_SQL_LIMIT_tag *limit,
                    const _SYSLOG_SQL_ORDER_tag *order);

    // From the first search after SnapshotBegin until SnapshotEnd all searches see the database in one state,
    // whatever others write meanwhile. Keep it short: the write-ahead log grows while it lasts, and a
    // database without one (journal mode DELETE) cannot be written. Both return 0 or -1, also when a snapshot
    // is (or none is) there.
    int SnapshotBegin();
    int SnapshotEnd();

private:
    KELOSYSLOG_LOCAL bool Connect();
    KELOSYSLOG_LOCAL int Run(const char *sql);

    std::string dbPath_;
    DBConnect_tag *connection_ = nullptr;
    bool isInSnapshot_ = false;
};

// A snapshot for the time of a scope.
class SyslogDBSnapshot {
public:
    // `reader` must live longer.
    explicit SyslogDBSnapshot(SyslogDBReader &reader)
        : reader_(reader), isTaken_(reader.SnapshotBegin() == 0) {}
    ~SyslogDBSnapshot() {
        if (isTaken_)
            reader_.SnapshotEnd();
    }
    SyslogDBSnapshot(const SyslogDBSnapshot &) = delete;
    SyslogDBSnapshot &operator=(const SyslogDBSnapshot &) = delete;

    // False when there is none, because the database cannot be opened or a snapshot is there already.
    bool IsTaken() const { return isTaken_; }

private:
    SyslogDBReader &reader_;
    bool isTaken_;
};
