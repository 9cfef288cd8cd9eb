#pragma once

#include <string>

namespace kelo::tool {

// Puts the accounting database at `path` aside as a damaged one, of which the administrator is notified, if
// it has views in place of its tables: loading one can take any time and memory. Throws DatabaseError if it
// cannot be moved.
void PutAsideIfItHasViews(const std::string &path);

// Creates the missing tables of the accounting database and the event log: a database that was created on a
// full disk has none, and its writers never create them. A missing database is not created here, but when it
// is needed. Failures are reported in the system log.
void CompleteDatabases(const std::string &root);

} // namespace kelo::tool
