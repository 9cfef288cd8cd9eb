#include "common/root.h"

#include <new>

#include "common/failure.h"
#include "keloplatform/root.h"

namespace {

// Never destroyed: static objects of a program may use the platform until the very end.
std::string &Root() {
    static std::string *const root = new std::string;
    return *root;
}

} // namespace

int KELORootSet(const char *root) {
    const char *text = root != nullptr ? root : "";
    if (text[0] != '\0' && text[0] != '/')
        return kelo::platform::Fail(KELO_FAILURE_ARGUMENT, "KELORootSet", text,
                                    "the root is a relative path");
    try {
        Root() = text;
    } catch (const std::bad_alloc &) {
        return kelo::platform::FailWithErrno("KELORootSet", text, ENOMEM);
    }
    return 0;
}

namespace kelo::platform {

std::string RootedPath(const std::string &path) {
    return Root() + path;
}

} // namespace kelo::platform
