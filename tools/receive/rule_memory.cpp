#include "receive/rule_memory.h"

namespace kelo::tool {
namespace {

constexpr char kTables[] =
    "CREATE TABLE IF NOT EXISTS spool_second(second INTEGER, records INTEGER, has_begun INTEGER, begin "
    "INTEGER, "
    "raised INTEGER);"
    "CREATE TABLE IF NOT EXISTS spool_rule(rule TEXT, raised INTEGER, suppressed INTEGER, to_tell INTEGER, "
    "kind INTEGER, what TEXT, host TEXT, eps INTEGER);"
    "CREATE TABLE IF NOT EXISTS spool_notice(id TEXT, kind INTEGER, what TEXT, host TEXT, eps INTEGER, "
    "content TEXT, is_held INTEGER, last_event INTEGER);"
    "DELETE FROM spool_second; DELETE FROM spool_rule; DELETE FROM spool_notice";

void BindMatch(SqliteStatement &row, int index, const RuleMatch &match) {
    row.Bind(index, static_cast<int64_t>(match.kind));
    row.Bind(index + 1, match.what);
    row.Bind(index + 2, match.host);
    row.Bind(index + 3, static_cast<int64_t>(match.eps));
}

RuleMatch MatchOf(const SqliteStatement &row, int column) {
    const int64_t kind = row.Number(column);
    return {.kind = kind == 0   ? RuleMatch::Kind::kSeverity
                    : kind == 1 ? RuleMatch::Kind::kKeyword
                                : RuleMatch::Kind::kEps,
            .what = row.Text(column + 1),
            .host = row.Text(column + 2),
            .eps = static_cast<uint64_t>(row.Number(column + 3))};
}

int64_t CountOf(const RateLimiter::Counts &counts, const std::string &rule) {
    const auto found = counts.find(rule);
    return found != counts.end() ? static_cast<int64_t>(found->second) : 0;
}

void SetCount(RateLimiter::Counts &counts, const std::string &rule, int64_t count) {
    if (count > 0)
        counts[rule] = static_cast<uint64_t>(count);
}

void SaveRules(SqliteConnection &database, const RuleMemory &memory) {
    SqliteStatement insert(database, "INSERT INTO spool_rule VALUES(?1,?2,?3,?4,?5,?6,?7,?8)");
    RateLimiter::Counts rules = memory.limit.raised; // every rule that was suppressed was raised before
    rules.insert(memory.limit.toTell.begin(), memory.limit.toTell.end());
    const RuleMatch none{}; // what is bound must stay until the statement has run
    for (const auto &[rule, ignored] : rules) {
        const auto last = memory.suppressed.find(rule);
        insert.Bind(1, rule);
        insert.Bind(2, CountOf(memory.limit.raised, rule));
        insert.Bind(3, CountOf(memory.limit.suppressed, rule));
        insert.Bind(4, CountOf(memory.limit.toTell, rule));
        BindMatch(insert, 5, last != memory.suppressed.end() ? last->second : none);
        insert.Run();
    }
}

void SaveNotices(SqliteConnection &database, const RuleMemory &memory) {
    SqliteStatement insert(database, "INSERT INTO spool_notice VALUES(?1,?2,?3,?4,?5,?6,?7,?8)");
    for (const Notice &notice : memory.waiting) {
        insert.Bind(1, notice.id);
        BindMatch(insert, 2, notice.match);
        insert.Bind(6, notice.content);
        insert.Bind(7, static_cast<int64_t>(notice.stage != Notice::Stage::kRaised));
        insert.Bind(8, notice.lastEvent);
        insert.Run();
    }
}

} // namespace

void SaveRuleMemory(SqliteConnection &database, const RuleMemory &memory) {
    database.Run(kTables);
    SqliteStatement insert(database, "INSERT INTO spool_second VALUES(?1,?2,?3,?4,?5)");
    insert.Bind(1, memory.second);
    insert.Bind(2, static_cast<int64_t>(memory.records));
    insert.Bind(3, static_cast<int64_t>(memory.limit.hasBegun));
    insert.Bind(4, memory.limit.begin);
    insert.Bind(5, static_cast<int64_t>(memory.limit.raisedByAll));
    insert.Run();
    SaveRules(database, memory);
    SaveNotices(database, memory);
}

RuleMemory LoadRuleMemory(SqliteConnection &database, int64_t now) {
    RuleMemory memory;
    if (database.Number("SELECT count(*) FROM sqlite_schema WHERE type = 'table' AND name IN "
                        "('spool_second', 'spool_rule', 'spool_notice')") < 3)
        return memory;
    SqliteStatement second(database, "SELECT second, records, has_begun, begin, raised FROM spool_second");
    if (second.Step()) {
        memory.second = second.Number(0);
        memory.records = static_cast<uint64_t>(second.Number(1));
        memory.limit.hasBegun = second.Number(2) != 0;
        memory.limit.begin = second.Number(3);
        memory.limit.raisedByAll = static_cast<uint64_t>(second.Number(4));
    }
    SqliteStatement rules(database,
                          "SELECT rule, raised, suppressed, to_tell, kind, what, host, eps FROM spool_rule");
    while (rules.Step()) {
        const std::string rule = rules.Text(0);
        SetCount(memory.limit.raised, rule, rules.Number(1));
        SetCount(memory.limit.suppressed, rule, rules.Number(2));
        SetCount(memory.limit.toTell, rule, rules.Number(3));
        if (rules.Number(2) > 0 || rules.Number(3) > 0)
            memory.suppressed[rule] = MatchOf(rules, 4);
    }
    SqliteStatement notices(database, "SELECT id, kind, what, host, eps, content, is_held, last_event "
                                      "FROM spool_notice ORDER BY rowid");
    while (notices.Step()) {
        const bool isHeld = notices.Number(6) != 0;
        memory.waiting.push_back({.match = MatchOf(notices, 1),
                                  .content = notices.Text(5),
                                  .id = notices.Text(0),
                                  .since = now,
                                  .stage = isHeld ? Notice::Stage::kNoted : Notice::Stage::kRaised,
                                  .lastEvent = notices.Number(7),
                                  .isInDoubt = isHeld});
    }
    return memory;
}

} // namespace kelo::tool
