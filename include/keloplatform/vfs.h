#pragma once

// How to open a database that somebody else may have prepared. Like root.h an addition of this platform.
//
// Threads: the function may be called from any thread.

#include "keloplatform/export.h"

extern "C" {

// The name of SQLite's file layer for every connection to a database: the fourth argument of sqlite3_open_v2.
//
// It is the default layer, but it opens no super-journal. The rollback journal beside a database may name
// one, at any path, and whoever rolls that journal back deletes the named file. Super-journals serve
// transactions over several attached databases, which log databases never have. A journal that names one is
// rolled back all the same; the statement that meets it fails with SQLITE_CANTOPEN, and the next one works.
//
// Never null. When out of memory the name is unknown to SQLite, and opening fails.
KELOPLATFORM_API const char *KELODBVfs();

} // extern "C"
