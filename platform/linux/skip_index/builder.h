#pragma once

#include <sqlite3.h>

#include <chrono>

#include "skip_index/index_file.h"

namespace kelo::platform {

enum class BuildResult {
    kComplete,   // nothing is left to do
    kMore,       // the time was over before
    kBusy,       // somebody else builds
    kNoTable,    // the database has no table that can have an index
    kTooSparse,  // few rows for its range of ids: the index would be large beside the database
    kNotAllowed, // the file cannot be written, or is not trusted
    kNoRoom,     // the volume is nearly full
    kFailed,     // errno, or the connection's error
};

// Builds the index of the database of `db` up to its newest complete piece, or until the time is over, on the
// calling thread; makes the file if there is none. An index that is damaged or that does not fit the database
// is thrown away, with a line in the system log, and built anew.
//
// `db` must be in no transaction. Throws std::bad_alloc, which leaves what was published.
BuildResult BuildIndex(sqlite3 *db, std::chrono::steady_clock::time_point deadline);

// Throws an index away whose slices were found damaged while it was used with `header`, with a line in the
// system log. Nothing happens where it has been changed since, or the caller may not.
void DiscardIndex(const std::string &dbPath, const DatabaseIdentity &database, const IndexHeader &header);

} // namespace kelo::platform
