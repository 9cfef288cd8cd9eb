#pragma once

#include <dlfcn.h>

#include <atomic>
#include <utility>

namespace kelo::platform {

// A function of a shared library that is loaded when the function is called first. To load libsystemd with
// every program takes longer than a search, and only a reload needs it. A program's own function of this name
// comes first, as it does when a library is linked.
//
// An object has the name of its function, so that callers in this namespace look as ever.
template <typename Function>
class LateFunction {
public:
    constexpr LateFunction(const char *library, const char *name) : library_(library), name_(name) {}

    // False if the library or the function is missing.
    bool IsThere() const { return Get() != nullptr; }

    // Only if it is there.
    template <typename... Arguments>
    auto operator()(Arguments &&...arguments) const {
        return Get()(std::forward<Arguments>(arguments)...);
    }

private:
    Function *Get() const {
        void *found = function_.load(std::memory_order_relaxed);
        if (found == nullptr) {
            found = dlsym(RTLD_DEFAULT, name_);
            void *handle = found == nullptr ? dlopen(library_, RTLD_NOW | RTLD_LOCAL) : nullptr; // for good
            if (handle != nullptr)
                found = dlsym(handle, name_);
            function_.store(found, std::memory_order_relaxed);
        }
        return reinterpret_cast<Function *>(found);
    }

    const char *library_;
    const char *name_;
    mutable std::atomic<void *> function_{nullptr};
};

} // namespace kelo::platform
