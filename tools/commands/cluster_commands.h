#pragma once

#include "cli/program.h"

namespace kelo::tool {

// Commands of "kelosyslog cluster" for one that runs: check and status.
void AddClusterState(Program &program, Command cluster);
// retention.
void AddClusterRetention(Program &program, Command cluster);

} // namespace kelo::tool
