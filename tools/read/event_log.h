#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <list>
#include <string>
#include <vector>

#include "kelosyslog/logger.h"
#include "read/log_filter.h"

namespace kelo::tool {

using Event = _SSYSLOG_LOG_LOG_tag;

// The server's own event database below `root`, or `db` if that is not empty, as an absolute path.
std::string EventDatabasePath(const std::string &db, const std::string &root);

// The events of a database, newest first: `limit` of them after `offset`, or all from the first for a limit
// of 0. Throws DatabaseError when it cannot be read; a missing one is not created.
std::list<Event> ReadEvents(const std::string &path, int offset = 0, int limit = 0);

// The events with an id above `lastId`, which becomes the largest of theirs, in the order in which they were
// added. Throws DatabaseError.
std::vector<Event> ReadEventsAfter(const std::string &path, int64_t &lastId);
// The largest id; 0 without events. Throws DatabaseError.
int64_t NewestEventId(const std::string &path);

// Adds an event to the server's own event database below `root` with the library operation that `add` calls.
// Returns "", or the reason of the failure.
std::string AddEvent(const std::string &root, const std::function<int(Logger &)> &add);

// Throws DatabaseError with the reason why the event database at `path` cannot be read, or changed.
[[noreturn]] void FailEventDatabase(const std::string &path, bool forWriting = false);

// The events that a command selects; both ends included.
struct EventFilter {
    int64_t since = std::numeric_limits<int64_t>::min(); // seconds since the epoch
    int64_t until = std::numeric_limits<int64_t>::max();
    std::vector<int> levels; // none for all

    bool Matches(const Event &event) const;
};

// Reads --since, --until and --priority of `filter`, the only ones that apply to events. Levels are
// "information" (or info), "warning" (warn), "error" (err) or 0 to 2: a single one means it and all worse,
// several mean each. Throws UsageError.
EventFilter ParseEventFilter(const LogFilter &filter, int64_t now);

// The name of an event's level, or its number if it has no name.
std::string EventLevelName(int level);

} // namespace kelo::tool
