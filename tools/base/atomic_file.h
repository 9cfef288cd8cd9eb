#pragma once

#include <string>
#include <string_view>

#include "base/files.h"

namespace kelo::tool {

// Files that are there whole or not at all, also after a crash, and names that last.

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
    FileHandle file_;
};

// Each of these sets errno when it fails.

// The same for a whole text: written as `temporary` with mode 0640, synced, renamed to `path`, whose folder
// is synced. Both paths are on one file system.
bool WriteFileAtomically(const std::string &temporary, const std::string &path, std::string_view content);

// Renames, and syncs the folders of both paths.
bool RenameDurably(const std::string &from, const std::string &to);

// Renames unless the new name is taken (EEXIST). Syncs nothing.
bool RenameToFreeName(const std::string &from, const std::string &to);

// Removes a file, and syncs its folder. One that is missing is removed.
bool RemoveDurably(const std::string &path);

// Makes the names in the folder of `path` survive a loss of power.
bool SyncFolderOf(const std::string &path);

} // namespace kelo::tool
