#pragma once

#include <string>

namespace kelo::platform {

// Where a fixed path of the platform stands under the root in force: the root followed by `path`, which
// begins with '/'.
std::string RootedPath(const std::string &path);

} // namespace kelo::platform
