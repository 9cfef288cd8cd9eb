#pragma once

#include <string>
#include <string_view>

#include "base/files.h"

namespace kelo::tool {

// Files that are complete or missing, also after a crash, and durable names.

// A temporary file in the folder of its target that gets the target's name when it is complete and on the
// disk. Until then, and after any failure, the target does not change.
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

    void Write(std::string_view text);

    // Syncs the file, gives it the target's mode or a new file's, and renames it.
    void Commit();

    [[noreturn]] void Fail(const std::string &reason) const;

private:
    std::string target_;
    std::string path_;
    FileHandle file_;
};

// Each of these sets errno when it fails.

// Renames unless the new name is taken (EEXIST). Syncs nothing.
bool RenameToFreeName(const std::string &from, const std::string &to);

// Removes a file, and syncs its folder. A missing file is a success.
bool RemoveDurably(const std::string &path);

// Makes the names in the folder of `path` durable.
bool SyncFolderOf(const std::string &path);

} // namespace kelo::tool
