#include "reference/command_tree.h"

#include <algorithm>
#include <cctype>

namespace kelo::tool {
namespace {

bool AreAlike(const CLI::Option &one, const CLI::Option &other) {
    return one.get_name(false, true) == other.get_name(false, true) &&
           one.get_type_name() == other.get_type_name() && one.get_description() == other.get_description();
}

constexpr const char *kNoGroup = "Options"; // where CLI11 puts options without a group

// The group's name without what a help text adds in parentheses.
std::string GroupOf(const CLI::Option &option) {
    return option.get_group().substr(0, option.get_group().find(" ("));
}

bool Has(const OptionList &options, const CLI::Option &wanted) {
    return std::any_of(options.begin(), options.end(),
                       [&](const CLI::Option *option) { return AreAlike(*option, wanted); });
}

void ListCommands(const CLI::App &app, const CommandNode &above, std::vector<CommandNode> &commands) {
    for (const CLI::App *below : app.get_subcommands(nullptr)) {
        const CommandNode command{below, above.app,
                                  above.path + (above.path.empty() ? "" : " ") + below->get_name()};
        commands.push_back(command);
        ListCommands(*below, command, commands);
    }
}

} // namespace

OptionList OptionsOf(const CLI::App &app) {
    return app.get_options([&app](const CLI::Option *option) {
        const bool isHelp = option == app.get_help_ptr() && app.get_parent() != nullptr;
        return !option->get_lnames().empty() && !isHelp;
    });
}

OptionList ArgumentsOf(const CLI::App &app) {
    return app.get_options([](const CLI::Option *option) { return option->get_positional(); });
}

std::string NameOf(const CLI::Option &option) {
    if (!option.get_positional())
        return "--" + option.get_lnames().front();
    std::string name = option.get_name(true);
    for (char &byte : name)
        byte = static_cast<char>(std::toupper(static_cast<unsigned char>(byte)));
    return name;
}

std::string PlaceholderOf(const CLI::Option &option) {
    // "[SECONDS]" means that it may be omitted, "SECONDS:INT in [1 - 600]" names its check.
    const std::string type = option.get_type_name();
    const size_t begin = type.starts_with('[') ? 1 : 0;
    return type.substr(begin, type.find_first_of(":]") - begin);
}

bool TakesMany(const CLI::Option &option) {
    return option.get_positional() && (option.get_items_expected_max() > 1 || option.get_allow_extra_args());
}

CommandTree::CommandTree(const CLI::App &app) {
    ListCommands(app, {nullptr, nullptr, ""}, commands_);
    for (const CommandNode &command : commands_) {
        for (const CLI::Option *option : OptionsOf(*command.app)) {
            if (IsInGroupOfSeveral(*option) && !IsCommon(*option))
                CommonGroup(GroupOf(*option)).push_back(option);
        }
    }
}

bool CommandTree::IsInGroupOfSeveral(const CLI::Option &option) const {
    const std::string group = GroupOf(option);
    const auto hasIt = [&](const CommandNode &command) {
        const OptionList options = OptionsOf(*command.app);
        return std::any_of(options.begin(), options.end(), [&](const CLI::Option *other) {
            return AreAlike(*other, option) && GroupOf(*other) == group;
        });
    };
    return group != kNoGroup && std::count_if(commands_.begin(), commands_.end(), hasIt) > 1;
}

OptionList &CommandTree::CommonGroup(const std::string &name) {
    const auto known =
        std::find_if(common_.begin(), common_.end(), [&](const auto &group) { return group.first == name; });
    return known != common_.end() ? known->second : common_.emplace_back(name, OptionList()).second;
}

bool CommandTree::IsCommon(const CLI::Option &option) const {
    return std::any_of(common_.begin(), common_.end(),
                       [&](const auto &group) { return Has(group.second, option); });
}

bool CommandTree::IsOfGroup(const CLI::Option &option, const CLI::App *group) const {
    return group != nullptr &&
           std::count_if(commands_.begin(), commands_.end(), [&](const CommandNode &command) {
               return command.group == group && Has(OptionsOf(*command.app), option);
           }) > 1;
}

OptionList CommandTree::DescribedWith(const CommandNode &command) const {
    OptionList options;
    for (const CLI::Option *option : OptionsOf(*command.app)) {
        if (!IsCommon(*option) && !IsOfGroup(*option, command.group))
            options.push_back(option);
    }
    for (const CommandNode &below : commands_) {
        for (const CLI::Option *option : OptionsOf(*below.app)) {
            if (below.group == command.app && IsOfGroup(*option, below.group) && !IsCommon(*option) &&
                !Has(options, *option))
                options.push_back(option);
        }
    }
    return options;
}

OptionList CommandTree::DescribedElsewhere(const CommandNode &command) const {
    OptionList options;
    for (const CLI::Option *option : OptionsOf(*command.app)) {
        if (IsCommon(*option) || IsOfGroup(*option, command.group))
            options.push_back(option);
    }
    return options;
}

} // namespace kelo::tool
