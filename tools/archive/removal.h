#pragma once

#include <cstdint>
#include <string>

#include "base/paced_changes.h"

namespace kelo::tool {

// Removes from a log database the records that are in an archive: each row with an id of the archive that is
// still the copied row. So a database that was replaced meanwhile, with the same ids, loses nothing, and an
// interrupted removal can be run again.
class Removal {
public:
    // Throws DatabaseError, which names the path and the cause.
    Removal(const std::string &source, const std::string &archive);

    // Removes all, as PacedChanges does. Throws DatabaseError with the number of records that were removed
    // before, and Interrupted.
    void Run();

    // Records that were removed, committed.
    uint64_t Removed() const { return removed_; }

private:
    uint64_t RemoveRows(int64_t rows, PacedChanges::Clock::time_point end);

    SqliteConnection source_;
    SqliteConnection archive_;
    SqliteStatement rows_; // of the archive, by id
    SqliteStatement remove_;
    PacedChanges changes_;
    bool hasRow_ = false; // whether `rows_` is at a row to remove
    uint64_t removed_ = 0;
};

} // namespace kelo::tool
