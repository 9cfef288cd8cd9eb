#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "cli/command.h"
#include "cli/message.h"

namespace kelo::tool {

// The parts of the command line that do not belong to a single subcommand.
//
// A subcommand has its own file with one public function that adds it to `app`. The function declares the
// options and sets the action that runs when the subcommand was chosen:
//
//     void AddCount(Program &program) {
//         auto options = std::make_shared<Options>();
//         Command command = AddSubcommand(program, "count", "Count logs", [options] { return Run(*options);
//         });
//         ...
//     }
//
// `run` returns an ExitStatus; it may throw the exceptions of errors.h.
struct Program {
    Program(const std::string &name, const std::string &description, const std::string &version);
    ~Program();
    Program(const Program &) = delete;
    Program &operator=(const Program &) = delete;

    Command Top() const { return Command(*app); }

    std::unique_ptr<CLI::App> app;
    std::string root; // --root, absolute or empty
    std::string errors = "text";
    std::function<int()> run; // set by the chosen subcommand
};

// Adds a subcommand; the program runs `run` after the whole command line was read and --root was applied.
Command AddSubcommand(Program &program, const std::string &name, const std::string &description,
                      std::function<int()> run);
// The same below a subcommand, `parent`.
Command AddSubcommand(Program &program, Command parent, const std::string &name,
                      const std::string &description, std::function<int()> run);

// Adds --root and --errors, which go with every subcommand.
void AddCommonOptions(Program &program);

// Reads a whole number from `minimum` to `maximum`; throws UsageError naming `option` and `text` otherwise.
uint64_t ParseNumber(const std::string &option, const std::string &text, uint64_t minimum, uint64_t maximum);

// Reads the command line, runs the chosen subcommand and maps every failure to an ExitStatus and one line.
int RunProgram(Program &program, int argc, const char *const *argv);

} // namespace kelo::tool
