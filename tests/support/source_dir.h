#pragma once

#include <string>

namespace kelo::test {

// The path of a file of the project: SourcePath("package/schema/logs.sql").
std::string SourcePath(const std::string &path);

} // namespace kelo::test
