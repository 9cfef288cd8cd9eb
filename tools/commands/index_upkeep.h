#pragma once

#include "read/log_table.h"

namespace kelo::tool {

// Lets a process of its own, in the background and at the lowest priority, bring the skip index of a log
// database up to date if a search had to read many rows that it does not know. It needs nothing of the
// caller, which may end. Nothing happens for a caller who may not write beside the database, or when
// KELO_SKIP_INDEX is set. Call it at the very end: after the output, and with no thread and no connection of
// the process left.
void ExtendIndexLater(const LogTable &table);

} // namespace kelo::tool
