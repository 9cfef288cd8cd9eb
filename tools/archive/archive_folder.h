#pragma once

#include <string>
#include <vector>

#include "base/files.h"

namespace kelo::tool {

// The folder of the archives during one run: no second run can use it, and the files of a killed run are
// removed. Temporary files have unique names and are removed with the object.
//
// All functions throw OutputError, which names the folder or the file and the cause.
class ArchiveFolder {
public:
    // `path` is absolute. A missing folder is created, with its parents, only with `mayCreate`: a folder that
    // a user named may be a file system that is not mounted.
    ArchiveFolder(std::string path, bool mayCreate);
    ~ArchiveFolder();
    ArchiveFolder(const ArchiveFolder &) = delete;
    ArchiveFolder &operator=(const ArchiveFolder &) = delete;

    const std::string &Path() const { return path_; }

    // Creates an empty temporary file that only its owner can read, and returns its path.
    std::string NewTemporary();
    void RemoveTemporary(const std::string &path) const;

    // A free name for an archive. It stays free during the lifetime of the object.
    std::string FreeName(const std::string &device, const std::string &firstDate,
                         const std::string &lastDate) const;

    // Syncs the temporary file, gives it mode, owner and group of the file at `like` as far as permitted, and
    // renames it to `name`. Returns its path.
    std::string Publish(const std::string &temporary, const std::string &name, const std::string &like) const;

    // The archives whose records must still be removed from the database at `source`: the note is written
    // before the archive gets its name and removed when the removal is complete.
    void NoteRemoval(const std::string &name, const std::string &source) const;
    void ForgetRemoval(const std::string &name) const;
    std::vector<std::string> PendingRemovals(const std::string &source) const;

private:
    FileHandle OpenLock() const;
    void RemoveLeftovers() const;
    std::vector<std::string> Names() const;
    [[noreturn]] void Fail(const std::string &path, int error) const;

    std::string path_;
    FileHandle lock_;
    int temporaries_ = 0;
};

} // namespace kelo::tool
