#pragma once

#include <CLI/CLI.hpp>

#include <string>

#include "kelonotify/deliverer.h"

namespace kelo::tool {

// What the command line of kelonotify says.
struct NotifierOptions {
    std::string root;
    bool mustStay = false;
    DelivererOptions delivery;
};

// Declares the whole command line; `options` gets what it says.
void DeclareCommandLine(CLI::App &app, NotifierOptions &options);

} // namespace kelo::tool
