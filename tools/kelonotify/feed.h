#pragma once

#include <string>

#include "spool/entry.h"

namespace kelo::tool {

// The file that a web back-end shows notifications from: one JSON object on each line, the newest last.
class Feed {
public:
    explicit Feed(std::string folder) : folder_(std::move(folder)) {}

    enum class Added { Yes, AlreadyThere, No };

    // Appends the entry durably, once: an id that the feed holds is not added again. What a crash left of an
    // unfinished line is cut off. A feed beyond 1 MiB becomes feed.1.jsonl first, in place of an older one.
    // `No` with errno set.
    Added Add(const Entry &entry) const;

private:
    std::string folder_;
};

} // namespace kelo::tool
