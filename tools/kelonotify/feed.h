#pragma once

#include <string>

#include "spool/entry.h"

namespace kelo::tool {

// The file of notifications for a web page: one JSON object on each line, the newest last.
class Feed {
public:
    explicit Feed(std::string folder) : folder_(std::move(folder)) {}

    enum class Added { Yes, AlreadyThere, No };

    // Appends the entry durably, once: an id that is in the feed is not added again. A line that a crash left
    // incomplete is cut off. A feed beyond 1 MiB is first renamed to feed.1.jsonl, over an older one.
    // `No` with errno set.
    Added Add(const Entry &entry) const;

private:
    std::string folder_;
};

} // namespace kelo::tool
