#pragma once

// Why an operation of the library failed that only says that it did: what it needs is asked for again.

#include <string>

namespace kelo::tool {

// Why the existing database at `path` does not run the statement `sql`, in SQLite's words where it still does
// not. What the statement changes is taken back.
std::string WhyStatementFails(const std::string &path, const std::string &sql);

// Why the database at `path` cannot be created from the file `schema`. What is wrong with the SQL of the
// schema the sqlite3 tool has written to the standard error.
std::string WhyNotCreated(const std::string &path, const std::string &schema);

} // namespace kelo::tool
