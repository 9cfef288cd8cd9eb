#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <string>
#include <string_view>

#include "base/files.h"
#include "receive/receipt_window.h"
#include "receive/spool_record.h"

namespace kelo::tool {

// The readers of the message spool.
enum class SpoolReader { kRows, kCounts };

// How far a reader has got in a file. It is recognised by its inode and its first bytes: names come again
// when the clock is set back, and inodes when files are removed.
struct SpoolPlace {
    ino_t inode = 0;
    std::string head; // the first bytes, no more than `offset`
    uint64_t offset = 0;
};

// An open file of the message spool and how far it has been read. What has been removed is read to its end.
struct SpoolFile {
    static constexpr size_t kHeadBytes = 64;
    static constexpr size_t kReaders = 2;

    // How far a reader has got, and what of it is in the database.
    struct Progress {
        uint64_t offset = 0;
        uint64_t saved = 0;
    };

    SpoolFile(FileHandle opened, const struct stat &status, std::string itsName);

    // Bytes at `position`, up to `limit` of the file; fewer than kBlockBytes only at its end. Throws
    // std::system_error.
    static constexpr size_t kBlockBytes = 1024 * 1024;
    std::string_view Read(std::string &buffer, uint64_t limit) const;

    // Looks at the size. Begins again at 0 if the file has become shorter.
    void Refresh();

    Progress &Of(SpoolReader reader) { return progress[static_cast<size_t>(reader)]; }
    SpoolPlace Place(SpoolReader reader) const;
    // A place that was saved for this inode. One in another file is without effect.
    void Restore(SpoolReader reader, const SpoolPlace &place);

    uint64_t Saved() const; // by all readers
    bool IsDone() const { return !isForeign && Saved() >= size; }

    FileHandle file;
    ino_t inode;
    std::string name;
    uint64_t size = 0;
    int64_t modified = 0; // seconds since the epoch
    bool isRemoved = false;
    bool isForeign = false; // of another version: nothing of it is read
    bool isCounted = false; // counted and checked before it came into the spool: only its rows are missing
    uint64_t position = 0;  // everything before has been read
    Progress progress[kReaders];
    SpoolParser parser;
    ReceiptWindow receipts;

private:
    std::string Head(uint64_t bytes) const;
};

} // namespace kelo::tool
