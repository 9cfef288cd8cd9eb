#include "cli/usage_text.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <vector>

#include "cli/completion.h"

namespace kelo::tool {
namespace {

using Words = std::vector<std::string>;

// How many letters must be inserted, removed, replaced or swapped with the next one to make `other`.
size_t Distance(const std::string &word, const std::string &other) {
    std::vector<std::vector<size_t>> steps(word.size() + 1, std::vector<size_t>(other.size() + 1));
    for (size_t i = 0; i <= word.size(); ++i) {
        for (size_t k = 0; k <= other.size(); ++k) {
            if (i == 0 || k == 0) {
                steps[i][k] = i + k;
                continue;
            }
            const bool isSame = word[i - 1] == other[k - 1];
            steps[i][k] =
                std::min({steps[i - 1][k] + 1, steps[i][k - 1] + 1, steps[i - 1][k - 1] + (isSame ? 0 : 1)});
            if (i > 1 && k > 1 && word[i - 1] == other[k - 2] && word[i - 2] == other[k - 1])
                steps[i][k] = std::min(steps[i][k], steps[i - 2][k - 2] + 1);
        }
    }
    return steps[word.size()][other.size()];
}

// The nearest of `known`, or "" if none is near.
std::string Nearest(const std::string &word, const Words &known) {
    constexpr size_t kLongestWord = 40;
    size_t best = word.size() > kLongestWord ? 0 : std::min<size_t>(3, word.size() / 2 + 1);
    std::string nearest;
    for (const std::string &candidate : known) {
        const bool isBegin = word.size() > 1 && candidate.starts_with(word);
        const size_t distance = isBegin ? 0 : Distance(word, candidate);
        if (distance < best) {
            best = distance;
            nearest = candidate;
        }
    }
    return nearest;
}

// The commands that the command line names, from the program down.
std::vector<const CLI::App *> Chosen(const CLI::App &app) {
    std::vector<const CLI::App *> chosen = {&app};
    while (!chosen.back()->get_subcommands().empty())
        chosen.push_back(chosen.back()->get_subcommands().front());
    return chosen;
}

Words CommandsBelow(const CLI::App &app) {
    Words names;
    for (const CLI::App *below : app.get_subcommands(nullptr))
        names.push_back(below->get_name());
    return names;
}

Words OptionsOf(const std::vector<const CLI::App *> &commands) {
    Words names;
    for (const CLI::App *command : commands) {
        for (const CLI::Option *option : command->get_options()) {
            for (const std::string &name : option->get_lnames())
                names.push_back("--" + name);
        }
    }
    return names;
}

std::string Join(const Words &words) {
    std::string text;
    for (const std::string &word : words)
        text += (text.empty() ? "" : ", ") + word;
    return text;
}

// "kelosyslog: " is in front of it; "db: " or nothing.
std::string NameOf(const CLI::App &command) {
    return command.get_parent() == nullptr ? "" : command.get_name() + ": ";
}

std::string DescribeExtra(const std::vector<const CLI::App *> &commands, std::string word) {
    const bool isOption = word.size() > 1 && word.front() == '-';
    const CLI::App &command = *commands.back();
    if (isOption)
        word = word.substr(0, word.find('='));
    const Words known = isOption ? OptionsOf(commands) : CommandsBelow(command);
    if (known.empty())
        return NameOf(command) + "takes no '" + word + "'";
    const std::string nearest = Nearest(word, known);
    std::string text = isOption ? word + ": no such option" : NameOf(command) + "no command '" + word + "'";
    if (!isOption && nearest.empty())
        return text + "; commands are " + Join(known);
    return text + (nearest.empty() ? "" : "; did you mean " + nearest + "?");
}

// The words of an argument that must be one of some; none for any other.
Words WordsOf(const CLI::Option &option) {
    const std::string offer = CompletionOf(Option(const_cast<CLI::Option &>(option)));
    constexpr std::string_view kKind = "words ";
    return offer.starts_with(kKind) ? CLI::detail::split(offer.substr(kKind.size()), ' ') : Words();
}

// Nothing is missing: "".
std::string DescribeMissing(const CLI::App &command) {
    if (command.get_subcommands().empty() && command.get_require_subcommand_min() > 0)
        return NameOf(command) + "which of " + Join(CommandsBelow(command)) + "?";
    for (const CLI::Option *option : command.get_options()) {
        if (!option->get_positional() || !option->get_required() || option->count() > 0)
            continue;
        const Words words = WordsOf(*option);
        if (!words.empty())
            return NameOf(command) + "which of " + Join(words) + "?";
    }
    return "";
}

} // namespace

std::string DescribeUsage(const CLI::App &app, const CLI::ParseError &error) {
    const std::vector<const CLI::App *> commands = Chosen(app);
    const std::vector<std::string> extras = app.remaining(true);
    const bool isMissing = error.get_exit_code() == static_cast<int>(CLI::ExitCodes::RequiredError);
    const bool isExtra = error.get_exit_code() == static_cast<int>(CLI::ExitCodes::ExtrasError);
    const bool isWrongCommand = isMissing && commands.back()->get_require_subcommand_min() > 0;
    std::string text;
    if (!extras.empty() && (isExtra || isWrongCommand))
        text = DescribeExtra(commands, extras.front());
    else if (isMissing)
        text = DescribeMissing(*commands.back());
    return (text.empty() ? error.what() : text) + " (see --help)";
}

} // namespace kelo::tool
