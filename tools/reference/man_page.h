#pragma once

#include <CLI/CLI.hpp>

#include <string>

namespace kelo::tool {

// The manual page of a program: the template with the declarations of `app` in place of these lines.
//
//     @synopsis  a line for each command
//     @commands  a subsection for each command, with its arguments and options
//     @common    a subsection for each group of options that several commands declare alike
//     @options   the options of the program itself
//
// The template contains text beyond the descriptions of the help texts, in blocks at any place:
//
//     @about delete --all
//     Needed when no option selects any.
//     @end
//
// A block is about a command ("db info"), an option or argument of a command, an option of the program or of
// several commands ("--since"), or a group of options by its name. Its line "@footer" is replaced by the end
// of the command's help text. Throws std::runtime_error for a block about an unknown subject.
std::string FillManPage(const CLI::App &app, const std::string &text);

} // namespace kelo::tool
