#pragma once

#include <cstdint>
#include <functional>
#include <string>

#include "archive/archive_folder.h"

namespace kelo::tool {

// The source of a copy and its selection.
struct CopyOrder {
    std::string source; // absolute path of a log database with table "logs"
    std::string host;   // only the records of this host; "" for all
    std::string device; // goes into db_info
    std::function<void(uint64_t bytes)> onCopied = [](uint64_t) {};
};

// A complete copy that may not be on the disk yet.
struct DatabaseCopy {
    std::string path; // a temporary file of the folder
    uint64_t logs = 0;
    std::string firstDate; // local dates, "2020-01-02"
    std::string lastDate;
};

// The number of records in the database at `source`, of one host or, for "", of all. Throws DatabaseError
// with the path and the cause.
uint64_t CountLogs(const std::string &source, const std::string &host);

// Copies the state of the database at one moment, by SQLite's online backup, while others read and write it.
// In WAL mode no other program waits for the copy; with a rollback journal writers wait until it is read.
//
// The copy has the table db_info with its row, no free pages and no records of other hosts, was checked for
// damage, and is one file in rollback-journal mode that can be read in any folder.
//
// Throws DatabaseError (the source cannot be read or is damaged, the disk is full), OutputError and
// Interrupted; the partial copy is removed with `folder`.
DatabaseCopy CopyDatabase(const CopyOrder &order, ArchiveFolder &folder);

// Copies and gives the copy its name; returns the copy with the archive's path. With `willRemove` the folder
// records, before the archive appears, that its records must be removed from the source.
DatabaseCopy MakeArchive(const CopyOrder &order, ArchiveFolder &folder, bool willRemove);

} // namespace kelo::tool
