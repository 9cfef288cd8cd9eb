#pragma once

// Finds the reason of a failed operation of the library if its result does not give it, by trying the steps
// again.

#include <string>

namespace kelo::tool {

// Why the statement `sql` failed on the existing database at `path`: SQLite's message if it fails again. A
// change is rolled back.
std::string WhyStatementFails(const std::string &path, const std::string &sql);

// Why the database at `path` could not be created from the file `schema`. Errors in the SQL of the schema are
// not found: the sqlite3 tool has written them to the standard error.
std::string WhyNotCreated(const std::string &path, const std::string &schema);

} // namespace kelo::tool
