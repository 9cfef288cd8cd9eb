#pragma once

#include "db/result.h"
#include "db/statement.h"

namespace kelo::platform {

// Prepares, for a query that has been prepared as `query`, a statement that delivers its rows into `result`
// as it is stepped, and itself yields one meaningless row. SQLite passes the values of a row to one call
// of an aggregate, which takes two thirds of the time of asking for them column by column.
//
// Null if the query cannot be wrapped in this way: a pragma, an EXPLAIN, too many columns.
// Throws std::bad_alloc.
Statement PrepareRowSink(sqlite3 *db, const SingleStatement &query, DBResult_tag &result);

} // namespace kelo::platform
