#pragma once

#include <string>

namespace kelo::tool {

// Creates the missing tables of the accounting database and the event log: a database that was created on a
// full disk has none, and its writers never create them. A missing database is not created here, but when it
// is needed. Failures are reported in the system log.
void CompleteDatabases(const std::string &root);

} // namespace kelo::tool
