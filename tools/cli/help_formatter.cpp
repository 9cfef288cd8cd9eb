#include "cli/help_formatter.h"

namespace kelo::tool {
namespace {

constexpr size_t kNameWidth = 28;
constexpr size_t kLineWidth = 100;

} // namespace

HelpFormatter::HelpFormatter() {
    column_width(kNameWidth);
    label("OPTIONS", "OPTION...");
    label("SUBCOMMAND", "COMMAND");
    label("Subcommands", "Commands");
}

std::string HelpFormatter::make_help(const CLI::App *app, std::string name, CLI::AppFormatMode mode) const {
    std::string text = CLI::Formatter::make_help(app, std::move(name), mode);
    for (size_t at = text.find("\n\n\n"); at != std::string::npos; at = text.find("\n\n\n", at))
        text.erase(at, 1);
    return text;
}

std::string HelpFormatter::make_option_desc(const CLI::Option *option) const {
    std::string text = option->get_description();
    size_t lineBegin = 0;
    while (text.size() - lineBegin > kLineWidth - kNameWidth) {
        const size_t blank = text.rfind(' ', lineBegin + kLineWidth - kNameWidth);
        if (blank == std::string::npos || blank <= lineBegin)
            break;
        text[blank] = '\n';
        lineBegin = blank + 1;
    }
    return text;
}

} // namespace kelo::tool
