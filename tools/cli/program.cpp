#include "cli/program.h"

#include <CLI/CLI.hpp>

#include <charconv>
#include <cstdio>

#include "base/errors.h"
#include "base/text_encoding.h"
#include "cli/command_line.h"
#include "cli/exit_status.h"
#include "cli/help_formatter.h"
#include "keloplatform/root.h"
#include "kelosyslog/root.h"

namespace kelo::tool {
namespace {

// "--option=" must give an empty value: CLI11 would take the next argument instead, which is dangerous
// where the option limits what a deletion removes.
std::vector<std::string> SplitEmptyValues(int argc, const char *const *argv) {
    std::vector<std::string> arguments;
    for (int i = 1; i < argc; ++i) {
        const std::string argument = argv[i];
        if (argument.size() > 3 && argument.starts_with("--") && argument.back() == '=' &&
            argument.find('=') == argument.size() - 1) {
            arguments.push_back(argument.substr(0, argument.size() - 1));
            arguments.emplace_back();
        } else {
            arguments.push_back(argument);
        }
    }
    return {arguments.rbegin(), arguments.rend()}; // CLI11 takes them from the back
}

void ApplyRoot(std::string &root) {
    if (root.empty())
        return;
    root = NormalRoot(root);
    if (SyslogRootSet(root) != 0 || KELORootSet(root.c_str()) != 0)
        throw UsageError("--root: cannot use '" + root + "'");
}

int RunCommand(Program &program, int argc, const char *const *argv) {
    std::vector<std::string> arguments = SplitEmptyValues(argc, argv);
    program.app->parse(arguments);
    if (!program.run)
        throw UsageError("a command is missing (see --help)");
    ApplyRoot(program.root);
    try {
        return program.run();
    } catch (const OutputClosed &) {
        return kExitFound;
    } catch (const DatabaseError &error) {
        PrintMessage(error.what());
        return kExitDatabase;
    }
}

} // namespace

Program::Program(const std::string &name, const std::string &description, const std::string &version)
    : app(std::make_unique<CLI::App>(description, name)) {
    app->set_version_flag("--version", name + " " + version);
    app->formatter(std::make_shared<HelpFormatter>());
}

Program::~Program() = default;

Command AddSubcommand(Program &program, const std::string &name, const std::string &description,
                      std::function<int()> run) {
    return AddSubcommand(program, program.Top(), name, description, std::move(run));
}

Command AddSubcommand(Program &program, Command parent, const std::string &name,
                      const std::string &description, std::function<int()> run) {
    Command command = parent.AddBelow(name, description);
    command.WhenChosen([&program, run = std::move(run)] { program.run = run; });
    return command;
}

void AddRoot(Program &program) {
    program.Top().AddText("--root", program.root, "DIR", "Look for the system's logs below DIR");
}

uint64_t ParseNumber(const std::string &option, const std::string &text, uint64_t minimum, uint64_t maximum) {
    uint64_t number = 0;
    const char *end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    if (error != std::errc() || stop != end || number < minimum || number > maximum) {
        throw UsageError(option + ": '" + text + "' is not a whole number from " + std::to_string(minimum) +
                         " to " + std::to_string(maximum));
    }
    return number;
}

void PrintMessage(const std::string &text) {
    std::fprintf(stderr, "kelosyslog: %s\n", EscapeForTerminal(text).c_str());
}

int RunProgram(Program &program, int argc, const char *const *argv) {
    return RunApp(*program.app, {kExitUsage, kExitSystem, PrintMessage, PrintMessage},
                  [&] { return RunCommand(program, argc, argv); });
}

} // namespace kelo::tool
