#include "common/root.h"

#include "common/failure.h"
#include "kelosyslog/root.h"

namespace {

// Constructed on first use: nothing of ours runs when the library is loaded. Never destroyed: a static object
// of the program may use the library until the very end, as an AccountingManager does that flushes then.
std::string &Root() {
    static std::string *const root = new std::string;
    return *root;
}

} // namespace

int SyslogRootSet(const std::string &root) {
    if (!root.empty() && root.front() != '/')
        return kelo::Fail(KELO_FAILURE_ARGUMENT, root, "SyslogRootSet", "the root is a relative path");
    Root() = root;
    return 0;
}

namespace kelo {

std::string RootedPath(const std::string &path) {
    return Root() + path;
}

} // namespace kelo
