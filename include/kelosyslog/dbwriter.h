#pragma once

// Storing records: they are appended to table "logs" of a database, a batch in one transaction.
//
//     SyslogDBWriter writer("/var/log/kelosyslog/logs.db");
//     LogParser parser;
//     parser.LogAdd(text);
//     if (writer.Store(parser.LogListGet()) != 0 && SyslogFailureGet()->kind == KELO_FAILURE_BUSY)
//         TryAgainLater();
//
// After a failure, a kill or a loss of power the database has whole batches, each with what a callback has
// written alongside. Larger batches cost less: a few thousand records, or what came within half a second.
//
// Threads: a writer is used by one thread at a time. Any number of writers, also in different threads and
// processes, may store into one database; they wait for each other. Reasons of failures are in failure.h.
// When memory runs out outside the database layer the functions throw std::bad_alloc, with nothing stored.

#include <cstddef>
#include <cstdint>
#include <list>
#include <memory>
#include <string>

#include "kelosyslog/export.h"
#include "kelosyslog/records.h"

struct DBConnect_tag;

namespace kelo {
class StoreConnection;
}

struct SyslogDBWriterOptions {
    int32_t busyTimeoutMs = 10'000; // how long to wait for another writer
    // Without it a commit is on the disk only with the next checkpoint: after a loss of power the last ones
    // may be missing, and the database is intact.
    bool mustSyncCommits = true;
};

// Writes something into the database in the transaction of a batch, after its records: a position to resume
// at, for example. `connection` (keloplatform/kelodb.h) is in that transaction, which the callback may not
// end. A result other than 0 undoes all of it, and so does an exception, which reaches the caller of Store.
using SyslogDBWriterCallback = int (*)(DBConnect_tag *connection, void *context);

class KELOSYSLOG_API SyslogDBWriter {
public:
    // `dbPath` is absolute. Nothing is opened before Open or the first Store.
    explicit SyslogDBWriter(std::string dbPath, const SyslogDBWriterOptions &options = {});
    // Closes the database.
    ~SyslogDBWriter();
    SyslogDBWriter(const SyslogDBWriter &) = delete;
    SyslogDBWriter &operator=(const SyslogDBWriter &) = delete;

    // Opens the database, unless it is open and still has its path. A missing one is created with the tables
    // of schema logs.sql, in WAL mode, in an existing folder; it appears under its name when it is complete,
    // but where a database that was moved has left files under its names. A database without any table gets
    // the tables too. Returns 0 or -1.
    int Open();

    // Opens the database as Open does and stores the `count` records at `logs`, or those of a list, whose ids
    // SQLite chooses, in ascending order; `id` and `extnum` are not stored. Then calls `alongside`, if there
    // is one. Returns 0, or -1 with nothing stored: also for a severity that is none of 0 to 7.
    int Store(const _SYSLOG_LOG_DATA_tag *logs, size_t count, SyslogDBWriterCallback alongside = nullptr,
              void *context = nullptr);
    int Store(const std::list<_SYSLOG_LOG_DATA_tag> &logs, SyslogDBWriterCallback alongside = nullptr,
              void *context = nullptr);

    // Closes the database. The next Store opens what has the path then.
    void Close();

    // Whether the open file was removed or renamed since it was opened. False when nothing is open.
    bool HasMoved() const;

    // The open connection, for statements of your own between two batches; null when nothing is open. It
    // belongs to the writer and is valid until the next call of one of its functions but HasMoved.
    DBConnect_tag *ConnectionGet() const;

private:
    std::string dbPath_;
    SyslogDBWriterOptions options_;
    std::unique_ptr<kelo::StoreConnection> connection_;
};
