#pragma once

#include "spool/spool.h"

namespace kelo::tool {

// The file of notifications for a web page, in the spool: one JSON object on each line, the newest last.
class Feed {
public:
    explicit Feed(const Spool &spool) : spool_(spool) {}

    enum class Added { Yes, AlreadyThere, No };

    // Appends the entry durably, once: an id that is in the feed is not added again. A line that a crash left
    // incomplete is cut off. A feed beyond 1 MiB is first renamed to feed.1.jsonl, over an older one.
    // `No` with errno set.
    Added Add(const Entry &entry) const;

private:
    const Spool &spool_;
};

} // namespace kelo::tool
