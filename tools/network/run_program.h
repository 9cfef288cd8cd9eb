#pragma once

#include <string>
#include <vector>

namespace kelo::tool {

struct ProgramRun {
    int status = 0;     // its exit status; 128 and the signal for one that was killed
    std::string output; // what it wrote to both outputs, 64 KiB at most
};

// Runs a program with these arguments, the first of which is its name, and waits for its end. It is looked
// for along PATH and in the folders of system programs. Throws OutputError if it cannot be started.
ProgramRun RunAndWait(const std::vector<std::string> &arguments);

} // namespace kelo::tool
