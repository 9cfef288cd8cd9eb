#pragma once

#include <sqlite3.h>

#include <memory>
#include <optional>

#include "db/page_bounds.h"
#include "db/result.h"

namespace kelo::platform {

// Runs a statement that reads the different values of a column of table "logs", by jumping from one to the
// next in the index of the column. SQLite itself would read the whole index. `page` is null for a statement
// without bounds.
//
// The result, and the failures, are those of RunIndexedSearch.
std::optional<bool> RunDistinctValues(sqlite3 *db, const char *sql, const PageBounds *page,
                                      std::unique_ptr<DBResult_tag> &rows);

} // namespace kelo::platform
