#pragma once

#include <functional>
#include <optional>

namespace kelo::test {

enum class Victim {
    kProcess, // the process that was started; those that it started go on
    kCaller,  // the process that makes the call
    kAll,     // as a loss of power ends them
};

// Runs `work` in a process, and kills the victim when that process or one that it has started is about to
// make its `number`-th system call (1 is the first) that changes files or processes. `heir` then runs in
// another process, beside what goes on. Returns the exit status of `heir`; nothing if there are fewer calls.
std::optional<int> KillAtCall(int number, Victim victim, const std::function<void()> &work,
                              const std::function<int()> &heir);

} // namespace kelo::test
