#include "read/failure_reason.h"

namespace kelo::tool {

std::string WhyFailed(const std::string &path, const KELOFAILURE &failure) {
    const std::string text = failure.text;
    const std::string place = failure.path;
    switch (failure.kind) {
    case KELO_FAILURE_NONE:
        return "see the system log";
    case KELO_FAILURE_BUSY:
        return "it is locked by another program (" + text + ")";
    case KELO_FAILURE_DAMAGED:
        return "it is damaged (" + text + ")";
    default:
        return place.empty() || place == path ? text : place + ": " + text;
    }
}

} // namespace kelo::tool
