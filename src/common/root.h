#pragma once

#include <string>

namespace kelo {

// Where a fixed path of the library stands under the root in force: the root followed by `path`, which begins
// with '/'.
std::string RootedPath(const std::string &path);

} // namespace kelo
