#pragma once

#include <string>

namespace kelo {

// The files of a database are moved or removed with these functions only, under its DatabaseLock. A
// connection that has them open keeps them, and shares none with the database that gets the name next: its
// write-ahead log and the memory that guards it ("-wal", "-shm") go together with the file.

// Renames the database at `dbPath` to `aside`. What has that name already is kept under that name with a
// number, ".1", ".2" and so on; where it cannot be renamed, the database gets the number. Returns 0, or errno
// if the file is not there or cannot be renamed; then nothing of it has changed.
int PutDatabaseAside(const std::string &dbPath, const std::string &aside);

// Deletes the database at `dbPath`; of a symbolic link the link.
void RemoveDatabase(const std::string &dbPath);

} // namespace kelo
