#pragma once

#include <cstdint>
#include <string>

#include "base/sqlite.h"

namespace kelo::tool {

// Removes from a log database the logs that an archive holds: each row that has an id of the archive and is
// still the row that was copied. So a database that began anew in the meantime, with the same ids, loses
// nothing, and a removal that was broken off can be run again.
//
// Rows go in short transactions of about a tenth of a second, with pauses in which other writers get in. The
// write-ahead log is emptied when it has grown.
class Removal {
public:
    // Throws DatabaseError, which names the path and the cause.
    Removal(const std::string &source, const std::string &archive);

    // Removes all. Waits up to half a minute for a locked database. Throws DatabaseError, which also tells
    // how many logs were removed before, and Interrupted.
    void Run();

    // Logs that were removed, committed.
    uint64_t Removed() const { return removed_; }

private:
    bool RemoveSome();
    uint64_t RemoveRows();
    void BoundWriteAheadLog();

    SqliteConnection source_;
    SqliteConnection archive_;
    SqliteStatement rows_; // of the archive, by id
    SqliteStatement remove_;
    bool hasRow_ = false; // whether `rows_` stands on a row that is to be removed
    int64_t rowLimit_;    // of one transaction
    uint64_t removed_ = 0;
};

} // namespace kelo::tool
