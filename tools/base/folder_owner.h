#pragma once

#include <functional>
#include <string>

namespace kelo::tool {

// Calls `work` and returns its result: "" or the reason why it failed. Where root works on a file in a folder
// of another user, a process of that user calls it: the sqlite3 tool, which creates missing databases, obeys
// whatever the user puts beside the file, and a user must not act as root. Nothing else of that process comes
// back; its exceptions become their texts.
//
// Without the privilege to become another user, as in the sandbox of a service, `work` is called here.
std::string AsOwnerOfFolder(const std::string &path, const std::function<std::string()> &work);

} // namespace kelo::tool
