#pragma once

#include <vector>

#include "network/listeners.h"
#include "print/statistics_table.h"

namespace kelo::tool {

// A row for each listener.
StatisticsTable TableOfListeners(const std::vector<Listener> &listeners);

} // namespace kelo::tool
