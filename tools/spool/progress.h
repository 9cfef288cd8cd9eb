#pragma once

#include <cstdint>
#include <map>
#include <string>

namespace kelo::tool {

// The state of an operation that may fail: the delivery to a target, or the use of a channel.
struct Attempts {
    bool isDone = false;
    int failures = 0;
    int64_t next = 0;   // not before this time (seconds since the epoch)
    std::string reason; // of the last failure
};

// Records a failure at `now`. The next attempt follows after 15 s, 30 s, one minute and so on, up to an hour.
void NoteFailure(Attempts &attempts, const std::string &reason, int64_t now);

// The delivery record of an entry, or the common record of all channels.
struct Progress {
    std::map<std::string, Attempts> targets; // "mail:admin@example.org", "push_mobile"; or names of channels
    int64_t since = 0;                       // when an administrator asked for a new try, 0 for never
    std::string reason;                      // why the entry was given up
};

// Throws std::runtime_error for a text that ToJson did not write.
Progress ParseProgress(const std::string &content);
std::string ToJson(const Progress &progress);

} // namespace kelo::tool
