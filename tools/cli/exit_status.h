#pragma once

namespace kelo::tool {

// What the program ends with. Scripts tell "no match" from "error" by it.
enum ExitStatus : int {
    kExitFound = 0,
    kExitNothing = 1,
    kExitUsage = 2,
    kExitDatabase = 3,
    kExitSystem = 4, // the output cannot be written, for example to a full disk, or memory ran out
};

} // namespace kelo::tool
