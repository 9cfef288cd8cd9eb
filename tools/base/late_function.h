#pragma once

#include <dlfcn.h>

#include <atomic>
#include <stdexcept>
#include <string>
#include <utility>

namespace kelo::tool {

// A function of a shared library that is loaded when the function is called first. To load libsystemd and
// libcrypto takes longer than a search, and most runs of a program call neither.
//
// An object has the name of its function, so that callers in this namespace look as ever.
template <typename Function>
class LateFunction {
public:
    constexpr LateFunction(const char *library, const char *name) : library_(library), name_(name) {}

    // Throws std::runtime_error if the library or the function is missing.
    template <typename... Arguments>
    auto operator()(Arguments &&...arguments) const {
        return Get()(std::forward<Arguments>(arguments)...);
    }

private:
    Function *Get() const {
        void *found = function_.load(std::memory_order_relaxed);
        if (found == nullptr) {
            void *handle = dlopen(library_, RTLD_NOW | RTLD_LOCAL); // until the program ends
            found = handle != nullptr ? dlsym(handle, name_) : nullptr;
            if (found == nullptr)
                throw std::runtime_error(std::string("cannot load ") + name_ + ": " + dlerror());
            function_.store(found, std::memory_order_relaxed);
        }
        return reinterpret_cast<Function *>(found);
    }

    const char *library_;
    const char *name_;
    mutable std::atomic<void *> function_{nullptr};
};

} // namespace kelo::tool
