#pragma once

#include <cstddef>

#include "site.h"

namespace kelo::stress {

// The disk under test: a small file system in memory, where it may be mounted, else the folder. It holds the
// files that an installed system has.
class Disk {
public:
    explicit Disk(const Site &site);

    bool CanFill() const { return isMounted_; }
    // Leaves so many bytes free, about.
    void Fill(size_t left);
    void Empty();

private:
    std::string filler_;
    bool isMounted_;
};

} // namespace kelo::stress
