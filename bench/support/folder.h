#pragma once

#include <string>

namespace kelo::bench {

// A folder that ends with the object.
class Folder {
public:
    explicit Folder(const std::string &name);
    ~Folder();
    Folder(const Folder &) = delete;
    Folder &operator=(const Folder &) = delete;

    const std::string &Path() const { return path_; }

private:
    std::string path_;
};

} // namespace kelo::bench
