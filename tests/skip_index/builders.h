#pragma once

#include <cstddef>
#include <string>

namespace kelo::test {

// Builders of the skip index of the database at `path` that are processes of their own.

// One that is killed, as by SIGKILL, when it enters or leaves its system call number `call` (those that read
// pages are not counted).
void BuildAndKill(const std::string &path, size_t call);

// One to which no file may grow beyond `bytes`. Returns the number of its lines in the system log.
size_t BuildWithin(const std::string &path, size_t bytes);

// Several at the same time. Returns the number of lines of all of them.
size_t BuildTogether(const std::string &path, size_t builders);

} // namespace kelo::test
