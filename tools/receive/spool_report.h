#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "receive/receiver.h"
#include "receive/spool_place.h"

namespace kelo::tool {

// Reads from the database at `path`, which may be missing or damaged: then nothing is read. Returns why it
// cannot be read now, else "".
std::string TryLoad(const std::string &path, const std::function<void(SqliteConnection &)> &read);

// Replaces the file /run/kelosyslog/spool-done, in which keep-spool finds the files of the message spool that
// all readers have read: a line "INODE BYTES NAME" for each. Returns false with errno set.
bool WriteSpoolDone(const std::string &root, const std::string &content);

// The size that the message spool, which has `bytes` now, can reach: where keep-spool closes it, or less if
// its volume has less room; 0 when that is unknown.
uint64_t SpoolLimit(const std::string &spool, uint64_t bytes);

} // namespace kelo::tool
