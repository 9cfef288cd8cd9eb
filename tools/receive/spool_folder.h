#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "base/files.h"
#include "base/folder.h"
#include "receive/spool_file.h"

namespace kelo::tool {

// The folder of the message spool, whose files syslog-ng appends to and keep-spool removes. Only files of the
// folder's owner that nobody else can write are read.
class SpoolFolder {
public:
    // No more files are open at a time; the others wait for their turn. Only some of them may have bytes to
    // be read: those that were read stay open until they are removed, and those of another version stay for
    // good.
    static constexpr size_t kMostOpen = 512;
    static constexpr size_t kMostUnread = 128;

    // Throws std::system_error when changes in the folder cannot be watched.
    explicit SpoolFolder(const std::string &path);

    // Becomes readable when something has changed in the folder. Drain takes that, and returns whether names
    // have changed, for Scan, and not only sizes, for Refresh.
    int Changes() const { return changes_.Get(); }
    bool Drain() const;
    void Refresh();

    // Opens new files, of which `opened` is told, gives up those that were removed and read, and renews
    // names and sizes.
    void Scan(const std::function<void(SpoolFile &)> &opened);

    // The open files by their names, which is the order of their messages unless the clock was set back.
    const std::vector<std::unique_ptr<SpoolFile>> &Files() const { return files_; }

    uint64_t Bytes() const { return bytes_; } // of all files
    uint64_t Unread() const;                  // of them not stored yet
    const std::string &Path() const { return path_; }

    SpoolFile *Find(ino_t inode) const; // among the open files
    bool AreAllOpen() const { return areAllOpen_; }

private:
    bool HasRoom() const;
    std::unique_ptr<SpoolFile> Open(const std::string &name);

    std::string path_;
    Folder folder_;
    FileHandle changes_;
    std::vector<std::unique_ptr<SpoolFile>> files_;
    uint64_t bytes_ = 0;
    uint64_t unopened_ = 0; // bytes of the files that wait
    bool areAllOpen_ = true;
    bool areOthersTold_ = false;
};

} // namespace kelo::tool
