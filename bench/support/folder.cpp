#include "support/folder.h"

#include <cstdlib>
#include <filesystem>

#include "support/measure.h"

namespace kelo::bench {

Folder::Folder(const std::string &name)
    : path_((std::filesystem::temp_directory_path() / (name + "-XXXXXX")).string()) {
    if (mkdtemp(path_.data()) == nullptr)
        Fail("no folder " + path_);
}

Folder::~Folder() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

} // namespace kelo::bench
