#pragma once

#include <map>
#include <string>

namespace kelo::tool {

// Fills a template: each line "@NAME" is replaced by the part of that name, all others stay. Throws
// std::runtime_error for a name without a part, and for a part without a line unless it is empty.
std::string FillTemplate(const std::string &text, const std::map<std::string, std::string> &parts);

} // namespace kelo::tool
