#include "read/event_log.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <filesystem>

#include "base/errors.h"
#include "base/folder_owner.h"
#include "base/number_text.h"
#include "read/failure_reason.h"
#include "read/log_table.h"
#include "read/read_only_query.h"
#include "read/severity_filter.h"
#include "read/time_expression.h"

namespace kelo::tool {
namespace {

constexpr int kWorstLevel = 2;

struct LevelWord {
    const char *word;
    int level;
};
constexpr std::array<LevelWord, 9> kLevelWords = {{{"information", 0},
                                                   {"info", 0},
                                                   {"0", 0},
                                                   {"warning", 1},
                                                   {"warn", 1},
                                                   {"1", 1},
                                                   {"error", 2},
                                                   {"err", 2},
                                                   {"2", 2}}};

int ParseEventLevel(const std::string &text) {
    for (const LevelWord &known : kLevelWords) {
        if (text == known.word)
            return known.level;
    }
    throw UsageError("--priority: '" + text +
                     "' is no level of an event; levels are information, warning, error");
}

std::vector<int> ParseEventLevels(const std::vector<std::string> &values) {
    const IncludeExclude split = SplitValues("--priority", values);
    std::vector<int> levels;
    for (const std::string &value : split.included)
        levels.push_back(ParseEventLevel(value));
    if (levels.size() == 1) {
        for (int level = levels.front() + 1; level <= kWorstLevel; ++level)
            levels.push_back(level);
    }
    if (levels.empty() && !split.excluded.empty())
        levels = {0, 1, kWorstLevel};
    for (const std::string &value : split.excluded)
        std::erase(levels, ParseEventLevel(value));
    if (levels.empty() && !values.empty())
        throw UsageError("--priority: every level is excluded");
    return levels;
}

// Whether there is an event after the `offset` newest, or no answer.
bool MayHaveEvents(const std::string &path, int offset) {
    const ReadOnlyQuery database({path, "log"}, std::chrono::seconds(1));
    try {
        return database.FirstRow("SELECT id FROM log LIMIT 1 OFFSET " + std::to_string(offset), {"id"})
            .has_value();
    } catch (const SqliteError &) {
        return true;
    }
}

} // namespace

std::string EventDatabasePath(const std::string &db, const std::string &root) {
    return db.empty() ? root + "/usr/kelo/etc/kelosyslog.db" : std::filesystem::absolute(db).string();
}

void FailEventDatabase(const std::string &path, bool forWriting) {
    throw DatabaseError(DescribeDatabaseProblem({path, "log"}, forWriting));
}

std::list<Event> ReadEvents(const std::string &path, int offset, int limit) {
    if (access(path.c_str(), R_OK) != 0) // the library would create a missing one
        FailEventDatabase(path);
    std::list<Event> events = Logger().LogEnum(path, offset, limit);
    // A failure also gives no events.
    if (events.empty() && MayHaveEvents(path, limit == 0 ? 0 : offset))
        FailEventDatabase(path);
    return events;
}

std::vector<Event> ReadEventsAfter(const std::string &path, int64_t &lastId) {
    const std::string sql = "SELECT * FROM log WHERE id > " + std::to_string(lastId) + " ORDER BY id";
    std::vector<Event> events;
    for (const ReadOnlyQuery::Row &row :
         ReadOnlyQuery({path, "log"}).Rows(sql, {"id", "level", "time", "user", "event"})) {
        lastId = SignedNumber(row[0]);
        Event event;
        event.id = static_cast<decltype(event.id)>(lastId);
        event.level = static_cast<decltype(event.level)>(SignedNumber(row[1]));
        event.time = SignedNumber(row[2]);
        event.user = row[3];
        event.event = row[4];
        events.push_back(event);
    }
    return events;
}

int64_t NewestEventId(const std::string &path) {
    return ReadOnlyQuery({path, "log"}).Number("SELECT max(id) AS value FROM log");
}

std::string AddEvent(const std::string &root, const std::function<int(Logger &)> &add) {
    const std::string path = EventDatabasePath("", root);
    const bool hasExisted = access(path.c_str(), F_OK) == 0;
    std::string reason = AsOwnerOfFolder(path, [&] {
        Logger logger;
        return add(logger) == 0 ? std::string() : WhyFailed(path);
    });
    if (!reason.empty() && hasExisted && access(path.c_str(), F_OK) != 0)
        return "it was damaged and is " + path + ".corrupt now";
    return reason;
}

bool EventFilter::Matches(const Event &event) const {
    return event.time >= since && event.time <= until &&
           (levels.empty() || std::find(levels.begin(), levels.end(), event.level) != levels.end());
}

EventFilter ParseEventFilter(const LogFilter &filter, int64_t now) {
    EventFilter events;
    if (!filter.since.empty())
        events.since = ParseTimeExpression("--since", filter.since, now).seconds;
    events.until = LastSecond(filter, now).value_or(events.until);
    events.levels = ParseEventLevels(filter.severities);
    return events;
}

std::string EventLevelName(int level) {
    const std::string name = strLevelGet(level);
    return name.empty() ? std::to_string(level) : name;
}

} // namespace kelo::tool
