#pragma once

// One SQLite database of the log server: created from its schema when missing, and quarantined when corrupt.
//
//     DBHandler db("/var/log/kelolog/archive.db", "/usr/kelo/syslog/schema/archive.sql");
//     if (db.DBCon() == 0) {
//         db.DBTranStart();
//         db.DBExecute("UPDATE db_info SET device='nas' WHERE id=1");
//         db.DBTranEnd();
//         db.DBDiscon();
//     }
//
// Operations return 0 or -1 unless stated otherwise and never throw on a database error. A handler is used by
// one thread at a time; several handlers, also in different processes, may work on one file.

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
    // Does not close an open connection: call DBDiscon first.
    ~DBHandler() = default;
    DBHandler(const DBHandler &) = delete;
    DBHandler &operator=(const DBHandler &) = delete;

    // Opens the connection, after creating a missing database (DBCreate). Fails on a connected handler. Every
    // failure is reported.
    int DBCon();
    // Closes the connection, if there is one. Always 0. The in-transaction flag stays as it is.
    int DBDiscon();
    bool isConnected() const;
    // 1 from a successful DBTranStart to the next successful DBTranEnd or DBTranRollback, else 0.
    int32_t isInTran() const;

    // Creates the database with the sqlite3 tool: its folder (with parents), the file from the schema,
    // write-ahead logging. A failure to set write-ahead logging is reported and tolerated. The paths go
    // through a shell: the database path in double quotes, the schema path bare.
    int DBCreate();

    // Runs one statement and hands its result to `callback` (which may be null), then frees it. A failed
    // statement goes to DBErrorHandle.
    int DBExecute(std::string sql, DBHandlerCallback callback, void *context);
    // Runs one statement without a result. Unlike the form above it reports nothing when the handler is not
    // connected.
    int DBExecute(std::string sql);

    // "BEGIN;", "END;" and "ROLLBACK;". Each checks that it is connected and that the flag allows it;
    // failures are reported but do not go to DBErrorHandle, and leave the flag as it was.
    int DBTranStart();
    int DBTranEnd();
    int DBTranRollback();

    // `text` made safe between single quotes; "" after a reported failure.
    std::string DBCmdEscape(std::string text);

    // Copies the write-ahead log into the database file. With `removeFiles`, unlinks "-wal" and "-shm"
    // afterwards: only for a database that is not open anywhere else.
    int DBWalCheckpoint(bool removeFiles);

    // Whether the database has a table of this name, which goes into the statement unchanged. A failed
    // query is reported and gives false.
    bool DBcheckTableExist(std::string table);

    // The reaction to a failed statement, called by DBExecute: reports it at a priority that its SQLite error
    // code decides (LOG_INFO for busy and the like, LOG_ERR else) and quarantines a corrupt database
    // (DBErrorHandle_SQLITE_CORRUPT).
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

// The reaction to a corrupt database: sends the notification "KELOSYSLOG_DB_CORRUPT", renames the file to its
// path followed by ".corrupt", which replaces an older one, and reloads syslog-ng so that it starts a fresh
// database. The "-wal" and "-shm" files stay where they are. `connection` is not used and stays open: its
// owner must disconnect, because a further statement on it would move the fresh database too.
//
// Returns 0, or -1: the notification could not be sent (the file keeps its name), the rename failed (with
// errno set), or the reload failed.
KELOSYSLOG_API int32_t DBErrorHandle_SQLITE_CORRUPT(DBConnect_tag *connection, std::string dbPath);

// Makes syslog-ng reopen its files: the package's own service if the package is enabled, else the
// system's. Returns 0, or -1 after a report.
KELOSYSLOG_API int32_t SyslogngHupSignalSend();

// Deletes syslog-ng's working database and makes syslog-ng start a new one when the file is larger than
// `limitKib` KiB (whole KiB count); of a symbolic link the link. "-wal" and "-shm" stay. Returns 0 when the
// file was examined, -1 when it cannot be (silently) or is no regular file (reported).
KELOSYSLOG_API int64_t SyslogngWorkingDbCheck(std::string dbPath, int32_t limitKib);

// Switches a database to write-ahead logging with the sqlite3 tool. The path goes through a shell without
// quotes, so it must hold no blanks. Returns 0, or -1 after a report.
KELOSYSLOG_API int32_t SyslogngWorkingDbSetJouWal(std::string dbPath);
