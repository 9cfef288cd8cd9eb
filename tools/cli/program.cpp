#include "cli/program.h"

#include <CLI/CLI.hpp>

#include <charconv>
#include <cstdio>

#include "base/errors.h"
#include "cli/command_line.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "cli/help_formatter.h"
#include "cli/message.h"
#include "keloplatform/cluster.h"
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

// The form of the errors, which must be known while the command line is read. `arguments` are in reverse.
MessageForm WantedForm(const std::vector<std::string> &arguments) {
    std::string before;
    for (auto word = arguments.rbegin(); word != arguments.rend() && *word != "--"; ++word) {
        if (*word == "--errors=json" || (before == "--errors" && *word == "json"))
            return MessageForm::kJson;
        before = *word;
    }
    return MessageForm::kText;
}

// Without a command: the short help, or an error for programs.
int MissCommand(const Program &program) {
    if (ParseMessageForm(program.errors) == MessageForm::kJson)
        throw UsageError("a command is missing (see --help)");
    std::fputs(program.app->help().c_str(), stderr);
    return kExitUsage;
}

int RunCommand(Program &program, int argc, const char *const *argv) {
    std::vector<std::string> arguments = SplitEmptyValues(argc, argv);
    SetMessageForm(WantedForm(arguments));
    program.app->parse(arguments);
    ParseMessageForm(program.errors);
    if (!program.run)
        return MissCommand(program);
    ApplyRoot(program.root);
    try {
        const int status = program.run();
        if (KELODBClusterMissingGet()[0] != '\0')
            PrintMessage(std::string("the answer is incomplete: ") + KELODBClusterMissingGet());
        return status;
    } catch (const OutputClosed &) {
        return kExitFound;
    } catch (const DatabaseError &error) {
        PrintError(kExitDatabase, error.what());
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

void AddCommonOptions(Program &program) {
    program.Top().AddText("--root", program.root, "DIR", "Look for the system's logs below DIR");
    OfferWords(program.Top().AddText(
                   "--errors", program.errors, "FORMAT",
                   "What is written to the standard error: text (default), or json (an object a line)"),
               {"text", "json"});
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

int RunProgram(Program &program, int argc, const char *const *argv) {
    const ExitHandling exits = {kExitUsage, kExitSystem,
                                [](const std::string &text) { PrintError(kExitUsage, text); },
                                [](const std::string &text) { PrintError(kExitSystem, text); }};
    return RunApp(*program.app, exits, [&] { return RunCommand(program, argc, argv); });
}

} // namespace kelo::tool
