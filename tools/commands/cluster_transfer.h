#pragma once

#include "cli/program.h"

namespace kelo::tool {

// Adds "cluster import" and "cluster export" below `cluster`.
void AddClusterTransfer(Program &program, Command cluster);

} // namespace kelo::tool
