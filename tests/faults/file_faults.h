#pragma once

#include <string>

namespace kelo::test {

// Makes chosen file operations of every SQLite connection in the process fail, through a VFS that becomes the
// default one at the first use and stays it. For one thread.
class FileFaults {
public:
    enum class Kind {
        kWrite, // writing, truncating and syncing, with an input/output error
        kFull,  // the same, with a full disk
        kRead,
    };

    // Puts the VFS in place. It leaves out the wait for the disk that a sync is, which makes tests fast.
    static void Install();

    // Makes the `first`-th operation of the kind from now fail (1 is the next one) and `times - 1` more after
    // it.
    static void Start(Kind kind, int first, int times);
    // Makes nothing fail any more. Returns whether an operation failed since Start.
    static bool Stop();
    // Whether files were written or truncated since Start and not synced afterwards.
    static bool HasUnsynced();
};

} // namespace kelo::test
