#pragma once

#include <functional>

#include "base/paced_changes.h"

namespace kelo::tool {

// A log database from which the oldest records are removed while others write into it. The file does not get
// smaller: what was removed leaves pages that new records use.
//
// All functions throw DatabaseError; those that remove also Interrupted, with what they did before committed.
class WorkingLog {
public:
    struct Room {
        uint64_t used = 0;     // bytes of the pages that hold something
        uint64_t reusable = 0; // of the others
    };

    WorkingLog(const std::string &path, SqliteMode mode);

    Room Measure();
    int64_t Records();   // as the distance between the first and the last id
    int64_t NewestSec(); // time of the last record; 0 without one
    int64_t CountBefore(int64_t sec);

    // Removes the records of before `sec`. Returns how many.
    uint64_t RemoveBefore(int64_t sec);
    // Removes the oldest records, in the order of their arrival, as long as `excess` gives a number of bytes
    // of which the log has too many. Returns how many.
    uint64_t RemoveOldest(const std::function<uint64_t(const Room &)> &excess);

private:
    uint64_t Remove(SqliteStatement &statement, int limitIndex, int64_t most);

    SqliteConnection database_;
    PacedChanges changes_;
};

} // namespace kelo::tool
