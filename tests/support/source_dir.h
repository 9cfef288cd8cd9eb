#pragma once

#include <string>

namespace kelo::test {

extern const char *const kSourceFolder;
extern const char *const kBuildFolder;

// The path of a file of the project: SourcePath("package/texts").
inline std::string SourcePath(const std::string &path) {
    return kSourceFolder + ("/" + path);
}
// The path of a file that the build made: BuildPath("package/schema/logs.sql"). The programs are in "bin".
inline std::string BuildPath(const std::string &path) {
    return kBuildFolder + ("/" + path);
}

} // namespace kelo::test
