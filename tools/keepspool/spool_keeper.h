#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <map>
#include <string>

#include "base/folder.h"

namespace kelo::tool {

// Removes the files of the message spool that the receiver has read, and holds the others to a size. Syncs
// them every second, which syslog-ng does not do.
//
// FOLDER/files has the files, and syslog-ng opens them by FOLDER/in, a link to it. While the spool is full
// the link is missing: syslog-ng cannot open the file of the next ten seconds, keeps the messages in memory
// and stops reading its connections.
class SpoolKeeper {
public:
    struct Limits {
        uint64_t bytes = 0; // of all files: from there on the spool is full
        uint64_t spare = 0; // as it is with fewer free bytes than these on its volume
    };

    // `doneFolder` has the file spool-done, in which the receiver names what it has read. It belongs to a
    // user with fewer rights, so nothing there is followed or taken for more than a wish: only files in
    // FOLDER/files are removed.
    SpoolKeeper(const std::string &folder, const std::string &doneFolder, Limits limits);

    // Does what is due; call it every second, `now` is in seconds since the epoch. Returns a line for the
    // administrator when the spool has become full, or cannot be used, or is well again; else "".
    std::string Step(int64_t now);

private:
    using Done = std::map<std::string, std::pair<uint64_t, uint64_t>>; // by name: inode and bytes

    bool Prepare();
    Done ReadDone() const;
    void Remove(const std::string &name, const struct stat &status, const Done &done, int64_t now);
    void Sync(const std::string &name, const struct stat &status);
    bool IsUnused(const std::string &name, const struct stat &status) const;
    std::string Judge(uint64_t bytes);
    bool SetOpen(bool isOpen) const;

    std::string path_;
    std::string donePath_;
    Limits limits_;
    std::map<ino_t, off_t> synced_; // sizes
    bool isPrepared_ = false;
    std::string said_;
    bool isFull_ = false;
};

} // namespace kelo::tool
