#pragma once

#include <string>

namespace kelo::bench {

// Path of a log database with `rows` rows of the kinds of text that a server's programs write, in the shipped
// schema and never analysed, and the same messages as lines in PATH.txt. It is made at the first call and
// kept in the folder for temporary files. 50 hosts, 30 programs, 200 rows a minute from 2020/01/01 on.
//
// Severity "emerg" is in one of 20,000 rows, "err" in one of 40, and "info" in the others. "Segfault" is in
// one of 100,000 messages, "unverändert" in one of 1,000, "publickey" in every sixth.
std::string RealTextDatabase(int rows);

} // namespace kelo::bench
