#pragma once

// The skip index of a log database: the file PATH-skip, by which KELODBExecute and KELODBSelectLimit find the
// rows that a keyword can match without reading the others. docs/skip-index.md describes it. Like root.h an
// addition of this platform.
//
// Threads: the functions may be called from any thread, but with a connection by one at a time.
//
// Statements have the same results with and without it. They use it where it is there and helps; only the
// functions here build it.

#include <cstdint>

#include "keloplatform/export.h"

struct DBConnect_tag;

extern "C" {

// What an index knows.
struct KELODBSkipIndex {
    int isPossible;    // 1 if the database has a table that can have an index
    int isThere;       // 1 if it has one that fits it
    int64_t firstId;   // the index knows the rows from this id on
    int64_t endId;     // up to before this one; the rows from here on are read by every search
    int64_t newestId;  // the largest id that the table ever had
    int64_t diskBytes; // what it takes on its volume
};

// Results of KELODBSkipIndexBuild.
enum {
    KELODB_SKIP_COMPLETE = 0,     // the index is up to date
    KELODB_SKIP_MORE = 1,         // the time was over before
    KELODB_SKIP_BUSY = 2,         // another process builds it
    KELODB_SKIP_FAILED = -1,      // errno has the reason
    KELODB_SKIP_NO_TABLE = -2,    // there is no table "logs" with AUTOINCREMENT ids
    KELODB_SKIP_NOT_ALLOWED = -3, // the caller may not write it, or the file there is not trusted
    KELODB_SKIP_NO_ROOM = -4,     // the volume is nearly full
    KELODB_SKIP_SPARSE = -5,      // the ids have large gaps: the index would be too large for its use
};

// Builds the index of the database at `path` as far as it is missing, for about `maxMs` milliseconds (0:
// until it is complete). What is built stays and is used at once. Rows are taken in pieces of 16,384 ids; a
// smaller rest waits. It reads the database and takes no lock of it that a writer would notice.
//
// An index that is damaged or belongs to another database is replaced, which the system log reports
// (warning).
KELOPLATFORM_API int KELODBSkipIndexBuild(const char *path, int maxMs);

// Tells what the index of the database of a connection, which is in no transaction, knows. Returns 0, or -1
// if the database cannot be read; the connection has the cause.
KELOPLATFORM_API int KELODBSkipIndexGet(DBConnect_tag *connection, KELODBSkipIndex *index);

// The number of ids that the last statement of the calling thread that an index served had to read beside it,
// because the index does not know them yet; -1 if no statement was served since the last call.
KELOPLATFORM_API int64_t KELODBSkipIndexLag(void);

// Removes the index of the database at `path`, which may be gone itself. Returns 0, 1 if there is none, or -1
// (errno). Searches that use it go on.
KELOPLATFORM_API int KELODBSkipIndexRemove(const char *path);

} // extern "C"
