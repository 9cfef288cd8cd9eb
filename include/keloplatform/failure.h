#pragma once

// Why a function of the platform failed, as a value. Like errors.h an addition of this platform: an
// appliance's own platform may lack it. libkelosyslog has a record of its own (kelosyslog/failure.h).
//
//     if (KELODBExecute(connection, sql, nullptr) < 0 && KELOFailureGet()->kind == KELO_FAILURE_BUSY)
//         TryLater();
//
// Threads: each one has a record of its own, so the functions may be called from any.

#include <cstdint>

#include "keloplatform/export.h"

enum KELOFAILUREKIND : int32_t {
    KELO_FAILURE_NONE = 0,       // nothing has failed
    KELO_FAILURE_OTHER = 1,      // none of the kinds below; the text says more
    KELO_FAILURE_BUSY = 2,       // somebody else has it locked: try again later
    KELO_FAILURE_MISSING = 3,    // no such file, section or key
    KELO_FAILURE_PERMISSION = 4, // the caller may not read or write it
    KELO_FAILURE_DAMAGED = 5,    // a damaged database, or no database
    KELO_FAILURE_FULL = 6,       // the disk or the quota is full
    KELO_FAILURE_ARGUMENT = 7,   // a null pointer, a relative path, a value that cannot be used
    KELO_FAILURE_TABLE = 8,      // the database has no such table
    KELO_FAILURE_COLUMN = 9,     // the table has no such column
    KELO_FAILURE_REGEX = 10,     // a regular expression that cannot be compiled
    KELO_FAILURE_MEMORY = 11,    // out of memory
    KELO_FAILURE_IO = 12,        // the disk cannot be read or written
    KELO_FAILURE_STATEMENT = 13, // SQL that is wrong, or that a constraint or trigger refuses
    KELO_FAILURE_FORMAT = 14,    // a text that is not in the format that is read
};

// A failure. failure_kind.h has the kinds of SQLite's and the system's errors. The texts are cut to their
// fields, are always terminated, and may hold any bytes but NUL.
struct KELOFAILURE {
    KELOFAILUREKIND kind;
    int sqliteCode;     // SQLite's extended result code; 0 if SQLite did not fail
    int systemCode;     // errno; 0 if no system call failed
    unsigned int count; // of the thread's failures, this one included
    char path[4096];    // of the file or folder; "" for none
    char tried[1024];   // the SQL statement, or the name of the function
    char text[1024];    // the reason, from SQLite or the system
};

extern "C" {

// The last failure of a function of libkeloplatform in the calling thread; of kind KELO_FAILURE_NONE when
// there was none. Every function that fails sets it, and one that succeeds leaves it as it is, like errno.
// That there is nothing (KELODBFetchRow after the last row, KELODBFetchField without such a column,
// TORVCFileExist, a key that a map does not have) is an answer and not a failure. GenSQLRegexp sets it for a
// regular expression that is broken.
//
// Never null. The record belongs to the thread and changes with its next failure.
KELOPLATFORM_API const KELOFAILURE *KELOFailureGet();

// Forgets the last failure; its count stays.
KELOPLATFORM_API void KELOFailureClear();

} // extern "C"
