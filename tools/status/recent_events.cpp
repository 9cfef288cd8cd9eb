#include "status/recent_events.h"

#include <cstdlib>

#include "base/number_text.h"
#include "read/read_only_query.h"

namespace kelo::tool {

std::vector<Event> ReadRecentEvents(const std::string &path, int limit) {
    const ReadOnlyQuery database({path, "log"}, std::chrono::milliseconds(150));
    std::vector<Event> events;
    for (ReadOnlyQuery::Row &row : database.Rows(
             "SELECT id, level, time, user, event FROM log ORDER BY time DESC LIMIT " + std::to_string(limit),
             {"id", "level", "time", "user", "event"})) {
        Event &event = events.emplace_back();
        event.id = std::atoi(row[0].c_str());
        event.level = std::atoi(row[1].c_str());
        event.time = SignedNumber(row[2]);
        event.user = std::move(row[3]);
        event.event = std::move(row[4]);
    }
    return events;
}

} // namespace kelo::tool
