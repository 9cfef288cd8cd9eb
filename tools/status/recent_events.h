#pragma once

#include <string>
#include <vector>

#include "read/event_log.h"

namespace kelo::tool {

// The newest events of the event database at `path`, newest first. Unlike ReadEvents it does not
// quarantine a damaged database. Throws DatabaseError.
std::vector<Event> ReadRecentEvents(const std::string &path, int limit);

} // namespace kelo::tool
