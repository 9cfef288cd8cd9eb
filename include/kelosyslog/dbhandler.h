#pragma once

// One SQLite database of the log server: created from its schema when missing, and quarantined when corrupt.
//
//     DBHandler db("/var/log/kelolog/archive.db", "/usr/kelo/syslog/schema/archive.sql");
//     const DBConnectionScope scope(db);
//     if (db.DBCon() == 0) {
//         db.DBTranStart();
//         db.DBExecute("UPDATE db_info SET device='nas' WHERE id=1");
//         db.DBTranEnd();
//     }
//
// Operations return 0 or -1 unless stated otherwise and never throw on a database error. Reasons of failures
// are in failure.h.
//
// Threads: a handler is used by one thread at a time; several handlers, also in different threads and
// processes, may work on one file. The free functions may be called from any thread. Creating, quarantining
// and removing a database exclude each other by a lock on the file PATH.lock, which is there only meanwhile.

#include <cstdint>
#include <string>

#include "kelosyslog/export.h"

struct DBConnect_tag;
struct DBResult_tag;

// The one row that describes a log database.
struct _ARCH_DB_INFO_tag {
    int64_t start_time = 0; // of the first record, seconds since the epoch
    int64_t end_time = 0;   // of the last record
    uint64_t log_count = 0;
    std::string device;
};

// Receives the result of a statement (null for a statement without columns), which stays the handler's own.
// The return value is ignored.
using DBHandlerCallback = int (*)(DBResult_tag *result, void *context);

class KELOSYSLOG_API DBHandler {
public:
    DBHandler() = default;
    DBHandler(std::string dbPath, std::string schemaPath);
    // Does not close an open connection: call DBDiscon first, or use a DBConnectionScope.
    ~DBHandler() = default;
    DBHandler(const DBHandler &) = delete;
    DBHandler &operator=(const DBHandler &) = delete;

    // Opens the connection, after creating a missing database as DBCreate does; a file without a byte counts
    // as missing. If another process or thread is creating the database, or quarantining it, waits for that
    // (up to 30 seconds) and connects to the result. Fails on a connected handler. Every failure is reported.
    int DBCon();
    // Closes the connection, if there is one. Always 0. The in-transaction flag stays as it is.
    int DBDiscon();
    bool isConnected() const;
    // 1 from a successful DBTranStart to the next successful DBTranEnd or DBTranRollback, else 0. When SQLite
    // itself has rolled back (a full disk, for example) it stays 1 for good, also after DBDiscon and DBCon:
    // make a new handler.
    int32_t isInTran() const;

    // Creates the database with the sqlite3 tool: its folder (with parents), the file from the schema,
    // write-ahead logging. A failure to set write-ahead logging is reported and tolerated. On a database that
    // is there the schema runs once more.
    //
    // Security: the paths go through a shell, so never take them from outside. The database path is put in
    // double quotes, so one with " $ ` \ or a line feed is refused, the schema path bare. A path without '/'
    // is taken for the folder, which is created, and fails; a symbolic link to nothing is refused.
    //
    // What a failed creation leaves is removed, unless it has records: another program was faster then.
    // Despite an error in the schema the rest of it runs, and the creation fails at the end. A process that
    // is killed leaves nothing or all of the database, provided that the schema is one transaction, as the
    // shipped ones are.
    int DBCreate();

    // Runs one statement and hands its result to `callback` (which may be null), then frees it. A failed
    // statement goes to DBErrorHandle. One with a NUL byte is reported and not run.
    int DBExecute(std::string sql, DBHandlerCallback callback, void *context);
    // Runs one statement without a result. Unlike the form above it reports nothing when the handler is not
    // connected.
    int DBExecute(std::string sql);

    // "BEGIN;", "END;" and "ROLLBACK;". Each checks that it is connected and that the flag allows it;
    // failures are reported but do not go to DBErrorHandle, and leave the flag as it was. After an END that
    // failed, roll back. If that fails too, disconnect, which undoes the transaction, and continue with a new
    // handler: on this one the flag stays 1 and DBTranStart fails.
    int DBTranStart();
    int DBTranEnd();
    int DBTranRollback();

    // `text` made safe between single quotes; "" after a reported failure.
    std::string DBCmdEscape(std::string text);

    // Copies the write-ahead log into the database file as far as no reader prevents it: 0 does not mean that
    // all of it was copied. With `removeFiles`, unlinks "-wal" and "-shm" afterwards, also if it was not. Use
    // that only on a database that is open nowhere else, and disconnect at once: what is written through this
    // connection afterwards can be lost.
    int DBWalCheckpoint(bool removeFiles);

    // Whether the database has a table of this name, which goes into the statement unchanged. A failed
    // query is reported and gives false.
    bool DBcheckTableExist(std::string table);

    // The reaction to a failed statement, called by DBExecute: reports it, at a priority that SQLite's error
    // code decides.
    //
    //     1 (SQLITE_ERROR)                        LOG_INFO if the database has a table "logs", else LOG_ERR
    //     5 (busy), 16 (empty), 26 (no database)  LOG_INFO
    //     11 (corrupt)                            LOG_ERR, after DBErrorHandle_SQLITE_CORRUPT
    //     any other                               LOG_ERR
    void DBErrorHandle(std::string sql);

    // Computed from table "logs". Count: -1 on failure. Times of the earliest and latest record in seconds
    // since the epoch: 0 for none and on failure. All are read as 32-bit numbers and saturate.
    int64_t DBLogCountGet();
    int64_t DBLogStartTimeGet();
    int64_t DBLogEndTimeGet();
    // Aliases of the three above.
    int64_t DBInfoCntGet();
    int64_t DBInfoStartGet();
    int64_t DBInfoEndGet();
    // The same times as local dates ("2020-01-02"); without records, after a report, the date of the epoch.
    std::string DBInfoStartStrGet();
    std::string DBInfoEndStrGet();

    // Write one column of row 1 of "db_info"; 0 also when that row is missing. `device` is not escaped.
    int DBInfoStartSet(unsigned long long startTime);
    int DBInfoEndSet(unsigned long long endTime);
    int DBInfoDevSet(std::string device);
    // Reads the first row of "db_info"; zeros when it has none. On failure `info` is untouched.
    int DBInfoGet(_ARCH_DB_INFO_tag &info);

private:
    KELOSYSLOG_LOCAL int RunTransactionStatement(const char *operation, int32_t forbiddenFlag,
                                                 const char *sql, const char *failure);

    std::string schemaPath_;
    std::string dbPath_;
    DBConnect_tag *connection_ = nullptr;
    int32_t inTransaction_ = 0;
};

// Disconnects a handler at the end of a scope.
class DBConnectionScope {
public:
    // `handler` must live longer.
    explicit DBConnectionScope(DBHandler &handler) : handler_(handler) {}
    ~DBConnectionScope() { handler_.DBDiscon(); }
    DBConnectionScope(const DBConnectionScope &) = delete;
    DBConnectionScope &operator=(const DBConnectionScope &) = delete;

private:
    DBHandler &handler_;
};

// The reaction to a corrupt database: sends the notification "KELOSYSLOG_DB_CORRUPT", renames the file to its
// path followed by ".corrupt", and its "-wal" and "-shm" files alike, and reloads syslog-ng so that it starts
// a fresh database. An older ".corrupt" is kept, as ".corrupt.1" and so on.
//
// Does nothing if the file of `connection` no longer has the path: whoever met the damage first has moved it,
// and what has the path now is sound. Without a connection (null) the caller answers for that. The connection
// stays open on the moved file: its owner must disconnect at once.
//
// Returns 0, or -1: there is no such file, it could not be locked (reported), the notification could not be
// sent (the file keeps its name), the rename failed (with errno set), or the reload failed.
KELOSYSLOG_API int32_t DBErrorHandle_SQLITE_CORRUPT(DBConnect_tag *connection, std::string dbPath);

// Makes syslog-ng reopen its files: the package's own service if the package is enabled, else the
// system's. Returns 0, or -1 after a report.
KELOSYSLOG_API int32_t SyslogngHupSignalSend();

// Deletes syslog-ng's working database and makes syslog-ng start a new one when the file is larger than
// `limitKib` KiB (whole KiB count); of a symbolic link the link. "-wal" and "-shm" go with it: who still has
// the file open shares nothing with the new one, and should disconnect. Returns 0 when the file was examined,
// -1 when it cannot be (silently) or is no regular file (reported).
KELOSYSLOG_API int64_t SyslogngWorkingDbCheck(std::string dbPath, int32_t limitKib);

// Switches a database to write-ahead logging with the sqlite3 tool. Security: the path goes through a shell
// without quotes, so it must hold no blanks and never come from outside. Returns 0, or -1 after a report.
KELOSYSLOG_API int32_t SyslogngWorkingDbSetJouWal(std::string dbPath);
