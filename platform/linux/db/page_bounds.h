#pragma once

namespace kelo::platform {

// Rows to skip, and then to take at most; a limit of 0 means all.
struct PageBounds {
    unsigned int limit;
    unsigned int offset;
};

} // namespace kelo::platform
