#pragma once

#include <functional>
#include <string>

namespace CLI {
class App;
}

namespace kelo::tool {

// What a program does when its command line, or its work, fails.
struct ExitHandling {
    int usage;                                              // exit status after a wrong command line
    int failure;                                            // and after any other exception
    std::function<void(const std::string &)> reportUsage;   // prints what was wrong, ...
    std::function<void(const std::string &)> reportFailure; // ... in one visible line
};

// Runs `body`, which reads the command line with `app` and works, and returns its exit status. Everything
// that it throws is mapped to an exit status: a request for help or the version is answered, all else is
// reported.
int RunApp(CLI::App &app, const ExitHandling &exits, const std::function<int()> &body);

// The value of --root, absolute and without a slash at its end; "" stays.
std::string NormalRoot(const std::string &root);

} // namespace kelo::tool
