#pragma once

#include <string>

namespace kelo::test {

// Makes chosen file operations of the whole process fail, those of SQLite too: the program replaces the
// system calls. No call waits for the disk. For one thread.
class FileFaults {
public:
    enum class Kind {
        kWrite, // writing, truncating, syncing and renaming, with an input/output error
        kFull,  // the same, with a full disk
        kRead,
    };

    // Makes the `first`-th operation of the kind from now fail (1 is the next one) and `times - 1` more after
    // it. What is written meanwhile is written by halves.
    static void Start(Kind kind, int first, int times);
    // Makes nothing fail any more. Returns whether an operation failed since Start.
    static bool Stop();
    // Whether files were written, or folders had files renamed, since Start and were not synced afterwards.
    static bool HasUnsynced();
    // The same of one file.
    static bool IsUnsynced(const std::string &path);
};

} // namespace kelo::test
