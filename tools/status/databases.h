#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace kelo::tool {

struct DatabaseStatus {
    // Damaged: SQLite reported it for the parts that were read. Unreadable: any other reason, given by
    // `problem`.
    enum class State { Good, Missing, Locked, Damaged, Unreadable };

    std::string name; // "logs", "accounting", "events", a name of --log, or "receive"
    std::string path;
    std::string table;
    State state = State::Good;
    std::string problem;          // "" when the state is good
    int64_t size = 0;             // bytes
    int64_t walSize = 0;          // bytes of the write-ahead log
    std::optional<int64_t> rows;  // nothing when unknown, as the next
    bool isEstimate = false;      // `rows` includes rows that were deleted in between
    std::optional<int64_t> first; // seconds since the epoch
    std::optional<int64_t> last;
    std::optional<int64_t> indexSize;   // bytes of the index for keywords; nothing without one, as the next
    std::optional<int64_t> unindexed;   // rows, at most, that it does not know and every search reads
    std::optional<int64_t> quarantined; // bytes of PATH.corrupt, if it exists
};

struct ArchiveStatus {
    std::string path;
    int64_t files = 0; // *.db
    int64_t size = 0;  // bytes
    std::string problem;
};

// The working log, the accounting and the event database below `root`; the transfer logs that exist; and
// `others`, which are log databases by their absolute paths, unless they are one of these.
//
// Reads a few pages of each, waits for a writer or anything else no longer than a fraction of a second, and
// changes nothing.
std::vector<DatabaseStatus> GatherDatabases(const std::string &root, const std::vector<std::string> &others);

// The folder of the archives below `root`; an empty status when there is none.
ArchiveStatus GatherArchives(const std::string &root);

} // namespace kelo::tool
