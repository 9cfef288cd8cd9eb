#pragma once

#include <re2/re2.h>

#include <memory>
#include <string>

struct sqlite3;

namespace kelo::platform {

// How all regular expressions are read.
re2::RE2::Options RegexOptions(bool ignoreCase);

// Compiles a regular expression (RE2 syntax, UTF-8) with bounded memory. Check ok() and error() of the
// result; nothing is logged.
std::unique_ptr<re2::RE2> CompileRegex(const std::string &regex, bool ignoreCase);

// Gives the connection the SQL functions regexp(REGEX, TEXT), which also is what TEXT REGEXP REGEX calls, and
// regexpi(REGEX, TEXT), which ignores case. They take linear time in the text and give
//
//   1 or 0   whether the regex is found anywhere in the text. As for LIKE and GLOB the text ends at its first
//            NUL; bytes that are not UTF-8 are read as Latin-1.
//   NULL     if an argument is NULL
//   error    for an invalid regex, with the regex and the reason
//
// A regex that is the same for every row is compiled once per statement. Triggers and views cannot call the
// functions. The sqlite3 shell has functions of the same names, so that a statement works there too.
//
// Returns false when SQLite refuses (out of memory).
bool RegisterSearchFunctions(sqlite3 *db);

} // namespace kelo::platform
