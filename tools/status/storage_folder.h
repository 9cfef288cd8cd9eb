#pragma once

#include <string>
#include <vector>

#include "status/receiver.h"
#include "status/syslog_ng.h"

namespace kelo::tool {

// Whoever stores should be the only one who can write the folder of the database: SQLite deletes and writes
// files that are named beside a database, and a service with that folder could use it to act as root. One
// line for each folder that syslog-ng stores into and that another user can write, and for the folder of the
// receiver if that cannot write it.
std::vector<std::string> FindFolderProblems(const SyslogNgStatus &syslogNg, const ReceiverStatus &receiver);

} // namespace kelo::tool
