#pragma once

namespace kelo::tool {

// The exit status of the program. It distinguishes "no match" from "error" for scripts.
enum ExitStatus : int {
    kExitFound = 0,
    kExitNothing = 1,
    kExitUsage = 2,
    kExitDatabase = 3,
    kExitSystem = 4, // the output cannot be written, for example to a full disk, or memory ran out
};

} // namespace kelo::tool
