#pragma once

#include <string>

namespace kelo {

// The place of a fixed path of the library under the current root: the root followed by `path`, which begins
// with '/'.
std::string RootedPath(const std::string &path);

} // namespace kelo
