#pragma once

#include <string>

namespace kelo::tool {

// Gives the accounting database and the event log the tables they lack: one that was created on a full disk
// is there without them, and whoever writes to it never creates them. A database that is missing is left
// alone, for it is created when it is needed. Failures are reported in the system log.
void CompleteDatabases(const std::string &root);

} // namespace kelo::tool
