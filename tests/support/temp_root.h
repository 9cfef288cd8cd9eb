#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>

namespace kelo::test {

namespace fs = std::filesystem;

// A fresh folder that disappears with the object. Its name holds nothing that needs quoting.
class TempRoot {
public:
    TempRoot() {
        if (mkdtemp(path_.data()) == nullptr)
            throw std::runtime_error("cannot create " + path_);
    }
    ~TempRoot() {
        std::error_code ignored;
        fs::remove_all(path_, ignored);
    }
    TempRoot(const TempRoot &) = delete;
    TempRoot &operator=(const TempRoot &) = delete;

    const std::string &Path() const { return path_; }
    std::string File(const std::string &name) const { return path_ + "/" + name; }

private:
    std::string path_ = (fs::temp_directory_path() / "kelosyslog-test-XXXXXX").string();
};

// The whole content of a file; "" when it cannot be read.
inline std::string ReadFile(const std::string &path) {
    std::ostringstream content;
    content << std::ifstream(path, std::ios::binary).rdbuf();
    return content.str();
}

// Creates or replaces a file, with its folders. Throws when it cannot.
inline void WriteFile(const std::string &path, const std::string &content) {
    fs::create_directories(fs::path(path).parent_path());
    std::ofstream file(path, std::ios::binary | std::ios::trunc);
    file << content;
    if (!file.flush())
        throw std::runtime_error("cannot write " + path);
}

} // namespace kelo::test
