#pragma once

#include <cstdint>
#include <string>

#include "base/sqlite.h"

namespace kelo::tool {

// Removes from a log database the records that are in an archive: each row with an id of the archive that is
// still the copied row. So a database that was replaced meanwhile, with the same ids, loses nothing, and an
// interrupted removal can be run again.
//
// Rows are removed in short transactions of about a tenth of a second, with pauses for other writers. The
// write-ahead log is emptied when it has grown.
class Removal {
public:
    // Throws DatabaseError, which names the path and the cause.
    Removal(const std::string &source, const std::string &archive);

    // Removes all. Waits up to half a minute for a locked database. Throws DatabaseError with the
    // number of records that were removed before, and Interrupted.
    void Run();

    // Records that were removed, committed.
    uint64_t Removed() const { return removed_; }

private:
    bool RemoveSome();
    uint64_t RemoveRows();
    void BoundWriteAheadLog();

    SqliteConnection source_;
    SqliteConnection archive_;
    SqliteStatement rows_; // of the archive, by id
    SqliteStatement remove_;
    bool hasRow_ = false; // whether `rows_` is at a row to remove
    int64_t rowLimit_;    // of one transaction
    uint64_t removed_ = 0;
};

} // namespace kelo::tool
