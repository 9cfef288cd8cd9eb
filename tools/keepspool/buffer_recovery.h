#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace kelo::tool {

// Who was to get the messages of a disk buffer.
enum class BufferOwner {
    kDatabase, // sql(): the receiver has counted them and checked them against the rules already
    kReceiver  // program(): nobody has seen them yet
};

// Hands the messages that wait in the disk buffer at `buffer`, which no syslog-ng uses any more, over to the
// message spool at `spool`, and gives the buffer the name BUFFER.done and its reserved disk space back.
//
// Each message gets there once, however often this is called and killed:
//  1. SPOOL/buffer-INODE gets the records, and is synced; nobody reads it there.
//  2. The buffer becomes BUFFER.done. Until then the file of the first step has no meaning and is made again.
//  3. That file gets its name in SPOOL/files, where the receiver finds it. What an earlier call has left
//     after the second step is known by the inode of BUFFER.done.
//
// Returns the number of messages, or nothing when an earlier call has handed them over, or nearly so.
// Throws OutputError, which names the file and the reason: then the messages are where they were.
std::optional<uint64_t> RecoverBuffer(const std::string &buffer, const std::string &spool, BufferOwner owner);

} // namespace kelo::tool
