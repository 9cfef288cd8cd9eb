#pragma once

#include <cerrno>
#include <exception>
#include <new>
#include <stdexcept>

namespace kelo::platform {

// Runs `body` for a function of the C interface, which throws no exception: an exception becomes the result
// `failed` with errno ENOMEM if memory ran out, EIO for anything else.
template <typename Result, typename Body>
Result CatchBadAlloc(Result failed, Body body) noexcept {
    try {
        return body();
    } catch (const std::bad_alloc &) {
        errno = ENOMEM;
    } catch (const std::length_error &) {
        errno = ENOMEM;
    } catch (const std::exception &) {
        errno = EIO;
    }
    return failed;
}

} // namespace kelo::platform
