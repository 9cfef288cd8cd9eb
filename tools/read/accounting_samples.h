#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace kelo::tool {

// The accounting database: `db` when it is given, else the system's below `root`. Absolute; nothing is
// opened.
std::string AccountingPath(const std::string &db, const std::string &root);

// Throws DatabaseError, with the reason if it is known, unless the database has a readable
// histogram. The library's getters answer a failure as if there were no rows.
void RequireHistogram(const std::string &path);

struct StampRange {
    int64_t first = 0; // seconds since the epoch
    int64_t last = 0;
};

// The stamps of the oldest and the newest sample of those in `range`; nothing when there is none. Throws
// DatabaseError.
std::optional<StampRange> StoredStamps(const std::string &path, const StampRange &range);

} // namespace kelo::tool
