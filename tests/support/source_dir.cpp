#include "support/source_dir.h"

namespace kelo::test {

// The only file that is compiled differently in every folder, so that a compiler cache serves all others.
std::string SourcePath(const std::string &path) {
    return KELO_SOURCE_DIR "/" + path;
}

std::string BuildPath(const std::string &path) {
    return KELO_BIN_DIR "/../" + path;
}

std::string ProgramFolder() {
    return KELO_BIN_DIR;
}

} // namespace kelo::test
