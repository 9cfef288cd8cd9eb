#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <string>

#include "base/sqlite.h"
#include "receive/rate_limiter.h"

namespace kelo::tool {

// What the checks of rules have to remember, so that a receiver that was killed goes on as if it had not
// been.

// What a rule has matched: a record of a host, or a number of records.
struct RuleMatch {
    enum class Kind { kSeverity, kKeyword, kEps };
    Kind kind;
    std::string what; // the severity, the keyword or the rule about numbers
    std::string host = {};
    uint64_t eps = 0;
};

// A notification and its event that are under way.
struct Notice {
    // It is held before anybody can get it, and that is noted in the database before it is released.
    enum class Stage { kRaised, kHeld, kNoted };
    RuleMatch match;
    std::string content;
    std::string id; // of the notification; empty: it is sent at once
    int64_t since;  // when it was raised
    Stage stage = Stage::kRaised;
    int64_t lastEvent = 0;  // in the event log, before its own
    bool isInDoubt = false; // noted by a receiver that was killed: it may be sent already
};

struct RuleMemory {
    RateLimiter::State limit;
    std::map<std::string, RuleMatch>
        suppressed;             // by rule: the last match, with the highest number of records
    std::deque<Notice> waiting; // oldest first
    int64_t second = 0;         // of the records that are counted, and their number
    uint64_t records = 0;
};

// Replaces what the database has. Throws SqliteError.
void SaveRuleMemory(SqliteConnection &database, const RuleMemory &memory);

// Nothing from a database that has never had any; the notices were raised at `now`. Throws SqliteError.
RuleMemory LoadRuleMemory(SqliteConnection &database, int64_t now);

} // namespace kelo::tool
