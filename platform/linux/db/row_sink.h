#pragma once

#include <string_view>

#include "db/result.h"
#include "db/statement.h"

namespace kelo::platform {

// Prepares, for a query that has been prepared as `query`, a statement that delivers its rows into `result`
// as it is stepped, and itself yields one meaningless row. SQLite passes the values of a row to one call
// of an aggregate, which takes two thirds of the time of asking for them column by column.
//
// For queries that SQLite combines with the aggregate: without an order or a limit (IsCopied).
//
// Null if the query cannot be wrapped in this way: a pragma, an EXPLAIN, too many columns.
// Throws std::bad_alloc.
Statement PrepareRowSink(sqlite3 *db, const SingleStatement &query, DBResult_tag &result);

// Whether SQLite would copy each value of the query on its way to the aggregate, which takes longer than to
// ask for them: it runs a query with ORDER BY or LIMIT apart from it. One that has these words as other than
// keywords counts too.
bool IsCopied(std::string_view query);

} // namespace kelo::platform
