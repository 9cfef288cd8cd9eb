#pragma once

#include <memory>

#include "db/connection.h"
#include "db/indexed_search.h"

namespace kelo::platform {

// Whether the open file begins with the first line of a description of a cluster. It is read through SQLite:
// closing another descriptor of the file would end the locks that the process has on it.
bool DescribesCluster(sqlite3 *db);

// Makes `connection` one to the cluster that the file describes. Null, with the thread's failure set, if the
// description is wrong. Throws std::bad_alloc.
DBConnect_tag *ConnectToCluster(std::unique_ptr<DBConnect_tag> connection, const char *path);

// Runs a statement on the cluster; `page` is null for one without bounds. False with the connection's error
// set. Throws std::bad_alloc, and std::length_error when the result is too big.
bool RunOnCluster(DBConnect_tag &connection, const char *sql, const PageBounds *page, DBResult_tag **result);

} // namespace kelo::platform
