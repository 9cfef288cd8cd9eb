// kelo_reference: generates the manual pages and the shell completion from the declared command lines of the
// programs, at build time.
//
// usage: kelo_reference kelosyslog.1|kelonotify.8|completion TEMPLATE RESULT

#include <CLI/CLI.hpp>

#include <cstdio>
#include <string>

#include "base/atomic_file.h"
#include "base/files.h"
#include "commands/commands.h"
#include "kelonotify/options.h"
#include "reference/bash_completion.h"
#include "reference/man_page.h"

namespace kelo::tool {
namespace {

std::string Fill(const std::string &what, const std::string &text) {
    if (what == "kelonotify.8") {
        CLI::App app;
        NotifierOptions options;
        DeclareCommandLine(app, options);
        return FillManPage(app, text);
    }
    const KelosyslogProgram program;
    return what == "completion" ? FillCompletion(*program.app, text) : FillManPage(*program.app, text);
}

int Run(const std::string &what, const std::string &path, const std::string &result) try {
    const std::optional<std::string> text = ReadWhole(path);
    if (!text)
        throw std::runtime_error("cannot be read");
    AtomicFile file(result);
    file.Write(Fill(what, *text));
    file.Commit();
    return 0;
} catch (const std::exception &error) {
    std::fprintf(stderr, "%s: %s\n", path.c_str(), error.what());
    return 1;
}

} // namespace
} // namespace kelo::tool

int main(int argc, char **argv) {
    return argc == 4 ? kelo::tool::Run(argv[1], argv[2], argv[3]) : 2;
}
