#pragma once

#include <string>

namespace kelo::bench {

// Path of a log database with `rows` rows in the table "logs" of the shipped schema: messages of about 100
// bytes, 50 hosts, 30 programs, one log a second from 2020/01/01 on. It is made at the first call and kept in
// the folder for temporary files, for the other programs and the next run.
std::string LogDatabase(int rows);

} // namespace kelo::bench
