#pragma once

#include <sqlite3.h>

namespace kelo::platform {

// Makes `code` (one of SQLITE_ERROR and so on) with `message` the last error of the connection, so that
// sqlite3_errcode() and sqlite3_errmsg() report a failure that SQLite itself did not detect.
void RaiseError(sqlite3 *db, int code, const char *message);

} // namespace kelo::platform
