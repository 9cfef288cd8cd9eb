#include "reference/bash_completion.h"

#include "cli/completion.h"
#include "reference/template.h"

namespace kelo::tool {
namespace {

constexpr const char *kNothing = "nothing";

std::string TableEntry(const std::string &key, const std::string &words) {
    return "        [\"" + key + "\"]=\"" + words + "\"\n";
}

// The long options, apart from --help and --version.
std::string OwnOptions(CLI::App &command) {
    std::string names;
    for (const CLI::Option *option : command.get_options()) {
        if (option->get_positional() || option == command.get_help_ptr() ||
            option == command.get_version_ptr())
            continue;
        names += "--" + option->get_lnames().front() + " ";
    }
    return names;
}

// A command of a group takes the group's options too, but refuses them where it has its own.
std::string OfferedOptions(CLI::App &command, CLI::App &app) {
    if (&command == &app)
        return OwnOptions(app) + "--version --help";
    std::string names = OwnOptions(command);
    if (names.empty() && command.get_parent() != &app)
        names = OwnOptions(*command.get_parent());
    return names + OwnOptions(app) + "--help";
}

struct Tables {
    std::string options = {};
    std::string values = {};
};

void AddOption(Tables &tables, CLI::Option &option, const std::string &path) {
    if (option.get_items_expected_min() == 0) // a flag, or a value that may be left out
        return;
    for (const std::string &name : option.get_snames())
        tables.values += TableEntry(path + " -" + name, CompletionOf(Option(option)));
    for (const std::string &name : option.get_lnames())
        tables.values += TableEntry(path + " --" + name, CompletionOf(Option(option)));
}

void AddCommand(Tables &tables, CLI::App &command, CLI::App &app, const std::string &path) {
    const std::string offered = OfferedOptions(command, app);
    tables.options += TableEntry(path, offered);
    size_t arguments = 0;
    for (CLI::Option *option : command.get_options()) {
        if (!option->get_positional()) {
            AddOption(tables, *option, path);
            continue;
        }
        const bool isLast = option->get_items_expected_max() > 1;
        const std::string number = isLast ? "+" : std::to_string(++arguments);
        if (const std::string offer = CompletionOf(Option(*option)); offer != kNothing)
            tables.values += TableEntry(path + " " + number, offer);
    }
    std::string names;
    for (CLI::App *below : command.get_subcommands({})) {
        names += " " + below->get_name();
        AddCommand(tables, *below, app, path + " " + below->get_name());
    }
    if (!names.empty())
        tables.values += TableEntry(path + " 1", "words" + names + (&command == &app ? " " + offered : ""));
}

} // namespace

std::string FillCompletion(CLI::App &app, const std::string &text) {
    Tables tables;
    AddCommand(tables, app, app, app.get_name());
    return FillTemplate(text, {{"options", tables.options}, {"values", tables.values}});
}

} // namespace kelo::tool
