#pragma once

#include <CLI/CLI.hpp>

#include <string>

#include "kelonotify/deliverer.h"

namespace kelo::tool {

// The values of kelonotify's command line.
struct NotifierOptions {
    std::string root;
    bool mustStay = false;
    int64_t lingerSec = 0; // stays while the next attempt follows within these
    DelivererOptions delivery;
};

// Declares the whole command line; `options` receives the values.
void DeclareCommandLine(CLI::App &app, NotifierOptions &options);

} // namespace kelo::tool
