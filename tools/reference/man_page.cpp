#include "reference/man_page.h"

#include <algorithm>
#include <map>
#include <sstream>
#include <stdexcept>

#include "reference/command_tree.h"
#include "reference/roff.h"
#include "reference/template.h"

namespace kelo::tool {
namespace {

std::string Usage(const std::string &command, const CLI::App &app) {
    std::string usage = RoffBold(command) + " [" + RoffItalic("OPTION") + "...]";
    for (const CLI::Option *argument : ArgumentsOf(app)) {
        const std::string name = RoffItalic(NameOf(*argument)) + (TakesMany(*argument) ? "..." : "");
        usage += argument->get_required() ? " " + name : " [" + name + "]";
    }
    return usage;
}

// "-S, --since TIME"
std::string Heading(const CLI::Option &option) {
    if (option.get_positional())
        return RoffItalic(NameOf(option)) + (TakesMany(option) ? "..." : "");
    std::string heading;
    for (const std::string &name : option.get_snames())
        heading += RoffBold("-" + name) + ", ";
    heading += RoffBold(NameOf(option));
    const std::string type = PlaceholderOf(option);
    if (option.get_items_expected_max() == 0)
        return heading;
    return heading +
           (option.get_items_expected_min() == 0 ? " [" + RoffItalic(type) + "]" : " " + RoffItalic(type));
}

// The template without its blocks, which are looked up by their subject.
class Template {
public:
    explicit Template(const std::string &text) {
        std::istringstream lines(text);
        std::string *block = nullptr;
        for (std::string line; std::getline(lines, line);) {
            if (line.starts_with(kAbout))
                block = &blocks_[line.substr(kAbout.size())];
            else if (line == "@end")
                block = nullptr;
            else
                *(block != nullptr ? block : &frame_) += line + "\n";
        }
    }

    const std::string &Frame() const { return frame_; }

    // The block about `subject`, or "". Each is used once.
    std::string Take(const std::string &subject) {
        const auto node = blocks_.extract(subject);
        return node ? node.mapped() : "";
    }

    void RequireAllTaken() const {
        if (!blocks_.empty())
            throw std::runtime_error("@about " + blocks_.begin()->first + ": there is nothing of this name");
    }

private:
    static constexpr std::string_view kAbout = "@about ";
    std::string frame_;
    std::map<std::string, std::string> blocks_;
};

std::string Footer(const CLI::App &app) {
    std::string text = ".nf\n";
    std::istringstream lines(app.get_footer());
    for (std::string line; std::getline(lines, line);)
        text += Roff(line) + "\n";
    return text + ".fi\n";
}

std::string Describe(const CLI::Option &option, const std::string &more) {
    const std::string text = RoffSentence(option.get_description(), PlaceholderOf(option)) + more;
    return text.empty() ? "" : ".TP\n" + Heading(option) + "\n" + text;
}

class ManPage {
public:
    ManPage(const CLI::App &app, const std::string &text) : app_(app), tree_(app), template_(text) {}

    std::string Fill() {
        const std::map<std::string, std::string> parts = {
            {"synopsis", Synopsis()}, {"commands", Commands()}, {"common", Common()}, {"options", Own()}};
        template_.RequireAllTaken();
        return FillTemplate(template_.Frame(), parts);
    }

private:
    std::string Synopsis() const {
        if (tree_.Commands().empty())
            return Usage(app_.get_name(), app_) + "\n";
        std::string text;
        for (const CommandNode &command : tree_.Commands()) {
            if (command.app->get_require_subcommand_min() == 0)
                text += (text.empty() ? "" : ".br\n") +
                        Usage(app_.get_name() + " " + command.path, *command.app) + "\n";
        }
        return text;
    }

    std::string Commands() {
        std::string text;
        for (const CommandNode &command : tree_.Commands())
            text += ".SS \"" + Roff(command.path) + "\"\n" + RoffSentence(command.app->get_description()) +
                    About(command) + Arguments(command) + OptionsOf(command);
        return text;
    }

    std::string About(const CommandNode &command) {
        std::string text = template_.Take(command.path);
        constexpr std::string_view kFooter = "@footer\n";
        if (const size_t at = text.find(kFooter); at != std::string::npos)
            text.replace(at, kFooter.size(), Footer(*command.app));
        return text;
    }

    std::string Arguments(const CommandNode &command) {
        std::string text;
        for (const CLI::Option *argument : ArgumentsOf(*command.app))
            text += Describe(*argument, template_.Take(command.path + " " + NameOf(*argument)));
        return text;
    }

    // Describes the options that the command does not share, and names the others.
    std::string OptionsOf(const CommandNode &command) {
        std::string text;
        std::string shared;
        for (const CLI::Option *option : tree_.DescribedWith(command))
            text += Describe(*option, template_.Take(command.path + " " + NameOf(*option)));
        for (const CLI::Option *option : tree_.DescribedElsewhere(command))
            shared += (shared.empty() ? "" : ", ") + RoffBold(NameOf(*option));
        return text + (shared.empty() ? "" : ".PP\nAlso takes " + shared + ".\n");
    }

    std::string Common() {
        std::string text;
        for (const auto &[group, options] : tree_.Common()) {
            text += ".SS \"" + Roff(group) + "\"\n" + template_.Take(group);
            for (const CLI::Option *option : options)
                text += Describe(*option, template_.Take(NameOf(*option)));
        }
        return text;
    }

    std::string Own() {
        std::string text;
        for (const CLI::Option *option : kelo::tool::OptionsOf(app_))
            text += Describe(*option, template_.Take(NameOf(*option)));
        return text;
    }

    const CLI::App &app_;
    CommandTree tree_;
    Template template_;
};

} // namespace

std::string FillManPage(const CLI::App &app, const std::string &text) {
    return ManPage(app, text).Fill();
}

} // namespace kelo::tool
