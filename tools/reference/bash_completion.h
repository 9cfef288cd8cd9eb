#pragma once

#include <CLI/CLI.hpp>

#include <string>

namespace kelo::tool {

// The completion script: the template with the tables of the commands of `app`.
//
//     @options   ["kelosyslog count"]="--since --until ... --help", for each command
//     @values    ["kelosyslog count --since"]="words now today ...", for each option that takes a value, and
//                ["kelosyslog db 1"]="words info ...", for arguments by their number, "+" for all further
//                ones
//
// The texts of @values are those of CompletionOf.
std::string FillCompletion(CLI::App &app, const std::string &text);

} // namespace kelo::tool
