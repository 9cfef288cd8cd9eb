#pragma once

#include <stdexcept>

namespace kelo::tool {

// The command line is wrong. The text names the option and the value.
struct UsageError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// A database cannot be read or changed. The text names its path.
struct DatabaseError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The standard output cannot be written.
struct OutputError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// The reader of the standard output has closed its end, which is not an error.
struct OutputClosed : std::exception {};

} // namespace kelo::tool
