#pragma once

#include <optional>

#include "base/files.h"

namespace kelo::tool {

// SIGHUP, SIGTERM and SIGINT as something to be polled and read. From its construction on these signals do
// nothing by themselves in the process.
class SignalSource {
public:
    // Throws std::system_error.
    SignalSource();

    // Can be read, and so polled, when a signal has come.
    int Fd() const { return file_.Get(); }

    // The number of a signal that has come; none when there is no further one.
    std::optional<int> Take();

private:
    FileHandle file_;
};

} // namespace kelo::tool
