#pragma once

#include <sys/types.h>

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "print/output.h"
#include "read/log_reader.h"

namespace kelo::tool {

struct FollowOptions {
    bool showAll = false;              // of the records that exist at the start
    uint64_t lines = 10;               // else this many of the newest
    uint64_t firstId = 1;              // and none with a smaller id
    std::optional<uint64_t> idleSec;   // stop after so many seconds without a new record
    std::optional<int64_t> until = {}; // stop when this second (of the epoch) has passed
};

// The file at a path, to notice that another has taken its place.
struct FileIdentity {
    dev_t device;
    ino_t inode;
    bool operator==(const FileIdentity &) const = default;
};
std::optional<FileIdentity> IdentifyFile(const std::string &path); // nothing when there is none

// Calls `printNews`, which returns how much there was, again and again until the bounds of `options` end it,
// and flushes `output` after each call. Returns the sum. OutputClosed ends it when the reader has closed its
// end.
uint64_t RepeatUntilOver(const FollowOptions &options, const std::function<uint64_t()> &printNews,
                         Output &output);

// Hands the logs that are there and then every new one to `format`, calls `print` once the database is
// closed, and flushes `output` after each batch. Returns their number when the bounds of `options` end it;
// OutputClosed ends it when the reader has closed its end.
//
// When another file takes the place of the database (a quarantine, a rotation), it goes on with the first log
// of the new one; while there is no file it waits.
uint64_t Follow(const LogReader &reader, const FollowOptions &options, const LogHandler &format,
                const ChunkHandler &print, Output &output);

} // namespace kelo::tool
