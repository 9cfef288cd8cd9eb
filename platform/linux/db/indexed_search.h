#pragma once

#include <sqlite3.h>

#include <memory>
#include <optional>

#include "db/page_bounds.h"
#include "db/result.h"

namespace kelo::platform {

// Runs a search, count or deletion by the skip index of the database, or a page of a range of times without a
// sort, with the result of the statement as it is. `page` is null for a statement without bounds, and `rows`
// receives the result if it is wanted.
//
// Nothing if the statement has to run as it is: it is another one, there is no index, or it did not help.
// Otherwise whether it succeeded; on failure the connection's error is set. Throws std::bad_alloc, and
// std::length_error when the result is too big; the database is unchanged then.
std::optional<bool> RunIndexedSearch(sqlite3 *db, const char *sql, const PageBounds *page, bool wantsRows,
                                     std::unique_ptr<DBResult_tag> &rows);

} // namespace kelo::platform
