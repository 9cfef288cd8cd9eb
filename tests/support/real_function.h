#pragma once

#include <dlfcn.h>

#include "support/fault_pause.h"

namespace kelo::test {

// The function behind the test program's own one of the same name.
template <auto *Function>
auto Real(const char *name) {
    const FaultPause pause;
    return reinterpret_cast<decltype(Function)>(dlsym(RTLD_NEXT, name));
}

} // namespace kelo::test
