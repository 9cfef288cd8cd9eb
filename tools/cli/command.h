#pragma once

#include <functional>
#include <string>
#include <vector>

namespace CLI {
class App;
class Option;
} // namespace CLI

// The declarations of a command line. The commands use these two handles, not the parser's own header, which
// takes longer to compile than all of a command.

namespace kelo::tool {

// An option or a positional argument of a command: a handle, which is copied freely. Each function that
// changes it returns it.
class Option {
public:
    explicit Option(CLI::Option &option) : option_(&option) {}

    Option Group(const std::string &heading); // under this heading of the help text
    Option Required();                        // a positional argument that must be given
    Option AnyNumber();                       // takes one value or more
    Option AnyNumberOrNone();                 // takes every argument that follows, none too
    Option Needs(const Option &other);        // goes only together with `other`
    Option Excludes(const std::string &name); // does not go together with the option `name`
    bool IsGiven() const;                     // once the command line was read

    CLI::Option &Parsed() const { return *option_; }

private:
    CLI::Option *option_;
};

// A command or a subcommand: a handle, which is copied freely.
class Command {
public:
    explicit Command(CLI::App &app) : app_(&app) {}

    // An option whose values arrive as they were typed, one per occurrence; none is split or interpreted. An
    // empty value is a usage error, because it probably is an unset shell variable. `values` must outlive the
    // reading of the command line.
    Option AddTexts(const std::string &names, std::vector<std::string> &values, const std::string &typeName,
                    const std::string &description);
    // The same for an option that may occur only once.
    Option AddText(const std::string &names, std::string &value, const std::string &typeName,
                   const std::string &description);
    // An option with a value that may be left out: `take` gets "" then.
    Option AddOptionalText(const std::string &names, std::function<void(const std::string &)> take,
                           const std::string &typeName, const std::string &description);
    // Values that follow the command, none is a value too, empty ones included.
    Option AddArguments(const std::string &name, std::vector<std::string> &values,
                        const std::string &description);
    // An option without a value.
    Option AddFlag(const std::string &names, bool &isSet, const std::string &description);

    // A command below this one. Options that it does not know are those of this command.
    Command AddBelow(const std::string &name, const std::string &description);
    // How many commands below this one a command line names, from `least` to `most`.
    void NeedBelow(int least, int most);
    // The text at the end of the help.
    void Footer(const std::string &text);
    // Runs when the command line names this command, as the last thing of reading it.
    void WhenChosen(std::function<void()> run);

    CLI::App &Parsed() const { return *app_; }

private:
    CLI::App *app_;
};

} // namespace kelo::tool
