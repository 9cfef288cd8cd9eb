#pragma once

#include <string>
#include <string_view>

namespace kelo::tool {

// A file that is written beside its target and takes the target's name only when it is complete and on the
// disk. Until then, and whenever something fails, the target stays what it was.
//
//     AtomicFile file("report.html");
//     file.Write(text);
//     file.Commit();
//
// All functions throw OutputError, which names the target and the reason.
class AtomicFile {
public:
    // Creates the temporary file in the target's folder.
    explicit AtomicFile(const std::string &target);
    // Removes the temporary file, unless it was committed.
    ~AtomicFile();
    AtomicFile(const AtomicFile &) = delete;
    AtomicFile &operator=(const AtomicFile &) = delete;

    // Where the temporary file stands, for others that write it by its name.
    const std::string &Path() const { return path_; }

    void Write(std::string_view text);

    // Syncs the file, gives it the target's mode or a new file's, and renames it.
    void Commit();

    [[noreturn]] void Fail(const std::string &reason) const;

private:
    std::string target_;
    std::string path_;
    int file_;
};

} // namespace kelo::tool
