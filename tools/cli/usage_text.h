#pragma once

#include <string>

namespace CLI {
class App;
class ParseError;
} // namespace CLI

namespace kelo::tool {

// What is wrong with a command line that `app` could not read, in words that help on: an unknown command or
// option is named with the nearest one that there is, and a missing word with those that it may be.
std::string DescribeUsage(const CLI::App &app, const CLI::ParseError &error);

} // namespace kelo::tool
