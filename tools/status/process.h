#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>

namespace kelo::tool {

// Public information about a process, from /proc (proc(5)).

// The name of a running process, of which the kernel keeps 15 characters; "" when there is none.
std::string ProcessName(pid_t pid);

// When the process was started, in seconds since the epoch; 0 when there is none.
int64_t ProcessStart(pid_t pid);

} // namespace kelo::tool
