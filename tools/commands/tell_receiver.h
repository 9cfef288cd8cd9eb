#pragma once

#include <string>

namespace kelo::tool {

// Makes a running receiver of this root load what was changed. When it cannot be told, a message says so:
// "the receiver goes on with `what`: ...".
void TellReceiver(const std::string &root, const std::string &what);

} // namespace kelo::tool
