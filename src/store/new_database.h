#pragma once

#include <string>

struct DBConnect_tag;

namespace kelo {

// Creates the log database at `dbPath` with its tables, in WAL mode, if it is missing. Returns 0, or -1 with
// the reason as the thread's last failure; nothing is left then.
int CreateLogDatabase(const std::string &dbPath);

// Gives a database without any table those of a log database. Somebody may have opened it, and so created the
// file, before anybody stored something in it. Returns 0 or -1 likewise.
int FillEmptyDatabase(DBConnect_tag *connection, const std::string &dbPath);

} // namespace kelo
