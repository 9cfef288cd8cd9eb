#pragma once

#include <list>
#include <string>

#include "read/event_log.h"

namespace kelo::tool {

// All of these events as one HTML page in the form of Logger::LogHtmlGen, except that it loads nothing, runs
// nothing and escapes every text.
std::string RenderEventPage(const std::list<Event> &events);

} // namespace kelo::tool
