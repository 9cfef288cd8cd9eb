#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>

namespace kelo::tool {

// The state of `kelosyslog receive` for other programs, in a file that it rewrites every few seconds and once
// more at its end. docs/receiving.md describes the file.
struct ReceiverState {
    int64_t pid = 0;
    int64_t started = 0; // seconds since the epoch, as are the next two
    int64_t updated = 0;
    int64_t ended = 0; // 0 while it runs, and after a kill

    uint64_t received = 0;                      // complete records
    std::map<std::string, uint64_t> incomplete; // set aside, by the mandatory field that was empty
    uint64_t rejected = 0;                      // set aside: too few fields
    uint64_t overlong = 0;                      // set aside: too long
    uint64_t stored = 0;                        // rows, if it stores into a database itself
    std::string database;                       // the absolute path of that database, or empty
    uint64_t suppressed = 0;                    // matches of rules without a notification of their own
    uint64_t lostNotifications = 0;             // of rules, given up
    uint64_t others = 0;                        // counted as DeviceNames::kOthers
    std::string waiting;                        // why reading pauses; empty when it does not
    double eps = 0;                             // complete records a second, between the last two updates

    // The message spool, if it receives from that.
    struct Spool {
        std::string folder;    // empty: it receives from a pipe
        uint64_t bytes = 0;    // of all files
        uint64_t limit = 0;    // what they are held to; 0 when unknown
        uint64_t unread = 0;   // bytes not stored yet
        int64_t behindSec = 0; // age of the first record among them
        double growth = 0;     // of the unread bytes a second, between the last two updates
        // In how many seconds they reach the limit at this rate; nothing if they do not grow.
        std::optional<int64_t> LastsSec() const;
        bool operator==(const Spool &) const = default;
    } spool;

    bool operator==(const ReceiverState &) const = default;
};

// The file below `root`, which is an absolute path or empty.
std::string ReceiverStatePath(const std::string &root);

// Writes the file, creating its folder if it is missing; a reader finds the whole old or new file.
// Returns false with errno set.
bool WriteReceiverState(const std::string &root, const ReceiverState &state);

// The content of the file; nothing when it is missing, cannot be read, or was not written by
// WriteReceiverState.
std::optional<ReceiverState> ReadReceiverState(const std::string &root);

} // namespace kelo::tool
