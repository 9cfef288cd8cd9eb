#pragma once

#include <sys/stat.h>

#include <optional>
#include <string>

#include "common/unique_fd.h"

namespace kelo::platform {

// A larger file is refused (EFBIG): configuration is never so large, and memory is limited.
inline constexpr off_t kMaxTextFileBytes = off_t{256} << 20;

// Opens the regular file at `path` for reading and stores its status. An empty descriptor with errno set on
// failure: EISDIR for a folder, EINVAL for anything else but a regular file. Never waits for a FIFO's writer.
UniqueFd OpenForReading(const std::string &path, struct stat &status);

// Everything from the descriptor's position to the end; nothing on failure, with errno set. `sizeHint` is the
// size to expect, in bytes.
std::optional<std::string> ReadAll(int fd, off_t sizeHint);

} // namespace kelo::platform
