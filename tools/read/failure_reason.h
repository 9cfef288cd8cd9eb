#pragma once

// Finds out why an operation of the library failed when its result does not say: tries again what it needs.

#include <string>

namespace kelo::tool {

// Why the statement `sql` failed on the existing database at `path`: SQLite's message where it fails again. A
// change is rolled back.
std::string WhyStatementFails(const std::string &path, const std::string &sql);

// Why the database at `path` could not be created from the file `schema`. Errors in the SQL of the schema are
// not found: the sqlite3 tool has written them to the standard error.
std::string WhyNotCreated(const std::string &path, const std::string &schema);

} // namespace kelo::tool
