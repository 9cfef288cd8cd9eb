#pragma once

#include <string>

namespace kelo::platform {

// The place of a fixed path of the platform under the current root: the root followed by `path`, which
// begins with '/'.
std::string RootedPath(const std::string &path);

} // namespace kelo::platform
