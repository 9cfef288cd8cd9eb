#pragma once

#include <CLI/CLI.hpp>

#include <functional>
#include <string>

namespace kelo::tool {

// What the command line asks for, as far as it does not belong to a single subcommand.
//
// A subcommand lives in a file of its own and shows one function that adds it to `app`. The function declares
// the options and leaves in `run` what is to be done when the subcommand was chosen:
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

// Adds an option whose values arrive as they were typed, one per occurrence; none is split or interpreted. An
// empty value is a usage error: it is rather an unset shell variable than a wish.
CLI::Option *AddTexts(CLI::App &command, const std::string &names, std::vector<std::string> &values,
                      const std::string &typeName, const std::string &description);

// The same for an option that may stand only once.
CLI::Option *AddText(CLI::App &command, const std::string &names, std::string &value,
                     const std::string &typeName, const std::string &description);

// Reads a whole number from `minimum` to `maximum`; throws UsageError naming `option` and `text` otherwise.
uint64_t ParseNumber(const std::string &option, const std::string &text, uint64_t minimum, uint64_t maximum);

// One line on the standard error, with the program's name in front and control bytes made visible.
void PrintMessage(const std::string &text);

// Reads the command line, runs the chosen subcommand and maps every failure to an ExitStatus and one line.
int RunProgram(Program &program, int argc, const char *const *argv);

} // namespace kelo::tool
