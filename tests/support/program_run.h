#pragma once

#include <string>
#include <vector>

namespace kelo::test {

struct ProgramResult {
    int status = -1; // exit status, -1 when a signal ended it
    std::string out;
    std::string err;
};

struct ProgramRun {
    std::vector<std::string> arguments;
    std::vector<std::string> environment = {}; // "NAME=value", in addition to the test's own
    std::string stdoutPath = {};               // an existing file that gets the output instead of `out`
};

// Runs the built kelosyslog to its end, without a terminal and with an empty standard input.
ProgramResult RunTool(const ProgramRun &run);
inline ProgramResult RunTool(const std::vector<std::string> &arguments) {
    return RunTool(ProgramRun{arguments});
}

} // namespace kelo::test
