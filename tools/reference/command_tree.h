#pragma once

#include <CLI/CLI.hpp>

#include <map>
#include <string>
#include <utility>
#include <vector>

namespace kelo::tool {

using OptionList = std::vector<const CLI::Option *>;

// The declarations of a command, in order: options with a long name, and arguments. --help is omitted, except
// for the program itself.
OptionList OptionsOf(const CLI::App &app);
OptionList ArgumentsOf(const CLI::App &app);

// "--since"; for an argument its name in capitals.
std::string NameOf(const CLI::Option &option);
// The placeholder of the value, such as "TIME"; "" if it has no name.
std::string PlaceholderOf(const CLI::Option &option);
// Whether it is an argument that may be repeated.
bool TakesMany(const CLI::Option &option);

struct CommandNode {
    const CLI::App *app;
    const CLI::App *group; // the command that it is below, or null
    std::string path;      // "db info"
};

// The commands of a program, and the place where each of their options is described:
//
// - An option that two commands declare alike in a group of the same name is common to the program.
// - One that two commands of a group of commands declare alike is described with that group.
// - All others are described with their command.
class CommandTree {
public:
    // `app` stays the caller's.
    explicit CommandTree(const CLI::App &app);

    // Each one before its subcommands.
    const std::vector<CommandNode> &Commands() const { return commands_; }

    // The common options by their groups, of which only what precedes " (" counts as the name.
    const std::vector<std::pair<std::string, OptionList>> &Common() const { return common_; }

    OptionList DescribedWith(const CommandNode &command) const;
    OptionList DescribedElsewhere(const CommandNode &command) const;

private:
    bool IsInGroupOfSeveral(const CLI::Option &option) const;
    OptionList &CommonGroup(const std::string &name);
    bool IsCommon(const CLI::Option &option) const;
    // Whether several commands of that group have it.
    bool IsOfGroup(const CLI::Option &option, const CLI::App *group) const;

    std::vector<CommandNode> commands_;
    std::vector<std::pair<std::string, OptionList>> common_;
};

} // namespace kelo::tool
