#include "cli/command.h"

#include <CLI/CLI.hpp>

#include <utility>

#include "base/errors.h"

namespace kelo::tool {
namespace {

void RequireValues(const std::string &names, const CLI::results_t &values) {
    for (const std::string &value : values) {
        if (value.empty())
            throw UsageError(names.substr(names.rfind("--")) + ": empty value");
    }
}

} // namespace

Option Option::Group(const std::string &heading) {
    option_->group(heading);
    return *this;
}

Option Option::Required() {
    option_->required();
    return *this;
}

Option Option::AnyNumber() {
    option_->expected(-1);
    return *this;
}

Option Option::AnyNumberOrNone() {
    option_->expected(0, -1)->allow_extra_args();
    return *this;
}

Option Option::Needs(const Option &other) {
    option_->needs(other.option_);
    return *this;
}

Option Option::Excludes(const std::string &name) {
    option_->excludes(name);
    return *this;
}

bool Option::IsGiven() const {
    return option_->count() > 0;
}

Option Command::AddTexts(const std::string &names, std::vector<std::string> &values,
                         const std::string &typeName, const std::string &description) {
    // A vector option would read "{}" as "no value" and "[a]" as a list.
    const auto take = [&values, names](const CLI::results_t &results) {
        RequireValues(names, results);
        values = results;
        return true;
    };
    return Option(*app_->add_option(names, take, description)
                       ->type_name(typeName)
                       ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll));
}

Option Command::AddText(const std::string &names, std::string &value, const std::string &typeName,
                        const std::string &description) {
    const auto take = [&value, names](const CLI::results_t &results) {
        RequireValues(names, results);
        value = results.back();
        return true;
    };
    return Option(*app_->add_option(names, take, description)->type_name(typeName));
}

Option Command::AddOptionalText(const std::string &names, std::function<void(const std::string &)> take,
                                const std::string &typeName, const std::string &description) {
    const auto takeLast = [take = std::move(take)](const CLI::results_t &results) {
        take(results.empty() ? std::string() : results.back());
        return true;
    };
    return Option(*app_->add_option(names, takeLast, description)->type_name(typeName)->expected(0, 1));
}

Option Command::AddArguments(const std::string &name, std::vector<std::string> &values,
                             const std::string &description) {
    return Option(*app_->add_option(name, values, description));
}

Option Command::AddFlag(const std::string &names, bool &isSet, const std::string &description) {
    return Option(*app_->add_flag(names, isSet, description));
}

Command Command::AddBelow(const std::string &name, const std::string &description) {
    CLI::App *command = app_->add_subcommand(name, description);
    command->fallthrough();
    return Command(*command);
}

void Command::NeedBelow(int least, int most) {
    app_->require_subcommand(static_cast<std::size_t>(least), static_cast<std::size_t>(most));
}

void Command::Footer(const std::string &text) {
    app_->footer(text);
}

void Command::WhenChosen(std::function<void()> run) {
    app_->callback(std::move(run));
}

} // namespace kelo::tool
