#pragma once

#include <CLI/CLI.hpp>

#include <functional>
#include <string>

namespace kelo::tool {

// The parts of the command line that do not belong to a single subcommand.
//
// A subcommand has its own file with one public function that adds it to `app`. The function declares the
// options and sets the action that runs when the subcommand was chosen:
//
//     void AddCount(Program &program) {
//         auto options = std::make_shared<Options>();
//         CLI::App *command = AddSubcommand(program, "count", "Count logs", [options] { return Run(*options);
//         });
//         ...
//     }
//
// `run` returns an ExitStatus; it may throw the exceptions of errors.h.
struct Program {
    CLI::App app;
    std::string root;         // --root, absolute or empty
    std::function<int()> run; // set by the chosen subcommand
};

// Adds a subcommand; the program runs `run` after the whole command line was read and --root was applied.
CLI::App *AddSubcommand(Program &program, const std::string &name, const std::string &description,
                        std::function<int()> run);
// The same below a subcommand, `parent`.
CLI::App *AddSubcommand(Program &program, CLI::App &parent, const std::string &name,
                        const std::string &description, std::function<int()> run);

// Adds --root, which goes with every subcommand.
void AddRoot(Program &program);

// Adds an option whose values arrive as they were typed, one per occurrence; none is split or interpreted. An
// empty value is a usage error, because it probably is an unset shell variable.
CLI::Option *AddTexts(CLI::App &command, const std::string &names, std::vector<std::string> &values,
                      const std::string &typeName, const std::string &description);

// The same for an option that may occur only once.
CLI::Option *AddText(CLI::App &command, const std::string &names, std::string &value,
                     const std::string &typeName, const std::string &description);

// Reads a whole number from `minimum` to `maximum`; throws UsageError naming `option` and `text` otherwise.
uint64_t ParseNumber(const std::string &option, const std::string &text, uint64_t minimum, uint64_t maximum);

// One line on the standard error, after the program's name, with control bytes made visible.
void PrintMessage(const std::string &text);

// Reads the command line, runs the chosen subcommand and maps every failure to an ExitStatus and one line.
int RunProgram(Program &program, int argc, const char *const *argv);

} // namespace kelo::tool
