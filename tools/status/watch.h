#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <string>

namespace kelo::tool {

// Draws a screen; `height` is the number of lines that fit, 0 for any number.
using DrawScreen = std::function<std::string(size_t height)>;

struct WatchOptions {
    std::chrono::milliseconds pause{2000}; // between two screens
    bool inPlace = true;                   // on a terminal, each screen over the one before
    std::string separator;                 // between two screens elsewhere
};

// Writes what `draw` returns to the standard output again and again, also when the terminal is resized,
// until SIGINT, SIGTERM or SIGHUP comes, or "q" is typed at a screen that is drawn in place.
//
// Screens in place use the alternate screen, and the terminal is restored afterwards, also after an
// exception. Throws OutputClosed when the reader has closed its end, and OutputError.
void Watch(const WatchOptions &options, const DrawScreen &draw);

} // namespace kelo::tool
