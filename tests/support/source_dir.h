#pragma once

#include <string>

namespace kelo::test {

// The path of a file of the project: SourcePath("package/texts").
std::string SourcePath(const std::string &path);
// The path of a file that the build made: BuildPath("package/schema/logs.sql").
std::string BuildPath(const std::string &path);
// The folder of the built programs.
std::string ProgramFolder();

} // namespace kelo::test
