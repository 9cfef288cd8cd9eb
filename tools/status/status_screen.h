#pragma once

#include <cstddef>
#include <string>

#include "status/server_status.h"

namespace kelo::tool {

struct ScreenLayout {
    size_t width = 0;  // characters in a line; 0 for any number
    size_t height = 0; // lines; 0 for any number
    bool hasColour = false;
};

// The status in readable form, in lines that end in a line feed: first what needs attention, then a section
// for each subject. Times are in the time zone of the process. Long lines are cut, except those of what
// needs attention, which are wrapped.
std::string RenderStatus(const ServerStatus &status, const ScreenLayout &layout);

} // namespace kelo::tool
