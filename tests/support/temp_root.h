#pragma once

#include <string>

namespace kelo::test {

// A fresh folder that disappears with the object. Its name holds nothing that needs quoting.
class TempRoot {
public:
    TempRoot();
    ~TempRoot();
    TempRoot(const TempRoot &) = delete;
    TempRoot &operator=(const TempRoot &) = delete;

    const std::string &Path() const { return path_; }
    std::string File(const std::string &name) const { return path_ + "/" + name; }

private:
    std::string path_;
};

// The whole content of a file; "" when it cannot be read.
std::string ReadFile(const std::string &path);
// Creates or replaces a file, with its folders. Throws when it cannot.
void WriteFile(const std::string &path, const std::string &content);

} // namespace kelo::test
