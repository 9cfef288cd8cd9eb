#pragma once

#include <CLI/CLI.hpp>

namespace kelo::tool {

// Help texts whose descriptions are wrapped, with exactly one blank line between their groups.
class HelpFormatter : public CLI::Formatter {
public:
    HelpFormatter();
    std::string make_help(const CLI::App *app, std::string name, CLI::AppFormatMode mode) const override;
    std::string make_option_desc(const CLI::Option *option) const override;
};

} // namespace kelo::tool
