#pragma once

#include <cerrno>
#include <new>
#include <stdexcept>

namespace kelo::platform {

// Runs `body` for a function of the C interface, which lets no exception out: running out of memory becomes
// errno ENOMEM and the result `failed`.
template <typename Result, typename Body>
Result Guarded(Result failed, Body body) noexcept {
    try {
        return body();
    } catch (const std::bad_alloc &) {
        errno = ENOMEM;
    } catch (const std::length_error &) {
        errno = ENOMEM;
    }
    return failed;
}

} // namespace kelo::platform
