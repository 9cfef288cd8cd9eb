// Random searches over hostile rows, compared with a filter that knows nothing of SQL.

#include "query/query_fixture.h"
#include "support/naive_match.h"

namespace kelo::test {
namespace {

using Log = _SYSLOG_LOG_DATA_tag;

const std::vector<_SYSLOG_DB_ATTRI_tag> kTextColumns = {SYSLOG_ATTRI_HOST, SYSLOG_ATTRI_PROG,
                                                        SYSLOG_ATTRI_MSG, SYSLOG_ATTRI_TAG};
const std::vector<std::string> kTexts = {"",     "nas",   "NAS", "n",   "na",    "O'Brien", "''", "100%",
                                         "1_0",  "a[b]c", "[",   "]",   "[nas]", "a\\b",    "\\", "\\%",
                                         "grün", "日本",  "日",  "a*b", "a?b",   "-- x",    ";",  "\"n\"",
                                         "\t\n", "nas01", "/*",  "10",  "9"};
const std::vector<std::string> kPatterns = {"*",   "?",   "??",  "n*",    "*s",   "*n*s*", "N?s",
                                            "*'*", "*[*", "[n*", "a[b]c", "*\\*", "*%*",   "1_0",
                                            "1?0", "*本", "?本", "gr?n",  "*\"",  "**",    "*?*"};

bool IsNull(const Log &log, int attr) {
    return attr == SYSLOG_ATTRI_PROG && log.id % 7 == 0;
}

const std::string &TextOf(const Log &log, int attr) {
    if (attr == SYSLOG_ATTRI_HOST)
        return log.host;
    return attr == SYSLOG_ATTRI_PROG ? log.prog : attr == SYSLOG_ATTRI_MSG ? log.msg : log.tag;
}

int64_t NumberOf(const Log &log, int attr) {
    return attr == SYSLOG_ATTRI_ID ? static_cast<int64_t>(log.id) : log.utcsec;
}

template <typename Value>
bool Holds(const Value &left, _SYSLOG_SQL_OP_tag op, const Value &right) {
    const bool results[] = {left == right, left != right, left<right, left <= right, left> right,
                            left >= right};
    return results[op];
}

bool Meets(const Log &log, const _SYSLOG_SQL_COND_tag &condition) {
    const auto &[attr, op, value, alternatives] = condition;
    if (attr == SYSLOG_ATTRI_ID || attr == SYSLOG_ATTRI_UTCSEC)
        return Holds<int64_t>(NumberOf(log, attr), op, std::stoll(value));
    const std::string &text = TextOf(log, attr);
    if (IsNull(log, attr) || op < SYSLOG_OP_LIKE)
        return !IsNull(log, attr) && Holds(text, op, value);
    const bool isExcluded = op == SYSLOG_OP_NOT_LIKE || op == SYSLOG_OP_NOT_GLOB;
    return isExcluded !=
           (op >= SYSLOG_OP_GLOB ? NaiveMatch(text, value) : NaiveMatch(LowerAscii(text), LowerAscii(value)));
}

bool MeetsAll(const Log &log, const Conditions &conditions) {
    return std::ranges::all_of(conditions, [&](const _SYSLOG_SQL_COND_tag &condition) {
        return Meets(log, condition) || std::ranges::any_of(condition.alternatives, [&](const auto &other) {
                   return Meets(log, other);
               });
    });
}

class Differential : public QueryTest {
protected:
    Differential() {
        for (uint64_t id = 1; id <= 500; ++id) {
            Log log;
            for (std::string *text : {&log.host, &log.prog, &log.msg, &log.tag})
                *text = Of(kTexts) + (OneIn(2) ? "" : Of(kTexts));
            log.id = id;
            log.utcsec = static_cast<int64_t>(id * 211 % 503); // unique, in another order than the ids
            logs_.push_back(log);
        }
        InsertLogs(path_, logs_);
        RunSql(path_, "UPDATE logs SET prog = NULL WHERE id % 7 = 0");
    }

    int Below(int end) { return static_cast<int>(engine_() % static_cast<unsigned>(end)); }
    bool OneIn(int times) { return Below(times) == 0; }
    template <typename T>
    const T &Of(const std::vector<T> &choices) {
        return choices[static_cast<size_t>(Below(static_cast<int>(choices.size())))];
    }
    _SYSLOG_SQL_COND_tag RandomComparison() {
        const auto op = static_cast<_SYSLOG_SQL_OP_tag>(Below(SYSLOG_OP_RAW));
        if (op < SYSLOG_OP_LIKE && OneIn(3))
            return {
                OneIn(2) ? SYSLOG_ATTRI_ID : SYSLOG_ATTRI_UTCSEC, op, std::to_string(Below(600) - 20), {}};
        const bool isPattern = op >= SYSLOG_OP_LIKE && !OneIn(4);
        return {Of(kTextColumns), op, isPattern ? Of(kPatterns) : Of(kTexts), {}};
    }
    Conditions RandomList() {
        Conditions conditions;
        for (int count = 1 + Below(3); count > 0; --count) {
            conditions.push_back(RandomComparison());
            for (int others = OneIn(2) ? Below(4) : 0; others > 0; --others)
                conditions.back().alternatives.push_back(RandomComparison());
        }
        return conditions;
    }

    std::vector<uint64_t> Select(const Conditions &conditions, _SYSLOG_SQL_LIMIT_tag *limit,
                                 _SYSLOG_SQL_ORDER_tag *order) {
        std::vector<uint64_t> ids;
        const auto collect = [](Log &log, void *context) {
            static_cast<std::vector<uint64_t> *>(context)->push_back(log.id);
            return 0;
        };
        EXPECT_EQ(SyslogDBSelect(path_, conditions, limit, order, collect, &ids, false), 0);
        return ids;
    }

    std::vector<uint64_t> Expected(const Conditions &conditions, const _SYSLOG_SQL_LIMIT_tag &limit,
                                   const _SYSLOG_SQL_ORDER_tag &order) const {
        std::map<int64_t, uint64_t> found; // id by what it is sorted by
        for (const Log &log : logs_) {
            if (MeetsAll(log, conditions))
                found[NumberOf(log, order.attr) * (order.ascending == 0 ? -1 : 1)] = log.id;
        }
        std::vector<uint64_t> ids;
        for (const auto &[key, id] : found)
            ids.push_back(id);
        ids.erase(ids.begin(), ids.begin() + static_cast<long>(std::min<size_t>(limit.offset, ids.size())));
        ids.resize(limit.limit == 0 ? ids.size() : std::min<size_t>(limit.limit, ids.size()));
        return ids;
    }

    std::mt19937 engine_{20200102};
    std::vector<Log> logs_;
};

TEST_F(Differential, SearchesFindWhatANaiveFilterFinds) {
    size_t found = 0, deleted = 0;
    for (int round = 0; round < 1000; ++round) {
        const Conditions conditions = RandomList();
        _SYSLOG_SQL_LIMIT_tag limit{static_cast<uint64_t>(Below(20)), static_cast<uint64_t>(Below(5))};
        _SYSLOG_SQL_ORDER_tag order{Below(2), OneIn(2) ? SYSLOG_ATTRI_ID : SYSLOG_ATTRI_UTCSEC};
        const std::vector<uint64_t> all = Expected(conditions, {0, 0}, order);
        PlatformCalls::Reset();
        ASSERT_EQ(Select(conditions, nullptr, &order), all) << TakeStatement();
        ASSERT_EQ(Select(conditions, &limit, &order), Expected(conditions, limit, order)) << TakeStatement();
        ASSERT_EQ(SyslogDBSelectCount(path_, conditions, nullptr, nullptr), static_cast<int>(all.size()));
        found += all.size();
        if (all.empty() || all.size() > 8 || round % 5 != 0)
            continue;
        ASSERT_EQ(SyslogDBDelete(path_, conditions), 0);
        deleted += all.size();
        std::erase_if(logs_, [&](const Log &log) { return MeetsAll(log, conditions); });
        ASSERT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), std::to_string(logs_.size()))
            << TakeStatement();
    }
    EXPECT_GT(found, 10000u);
    EXPECT_GT(deleted, 50u) << found;

    // Without a filter a page is a range of ids, and thinner where rows were deleted.
    const int64_t newest = static_cast<int64_t>(logs_.back().id);
    _SYSLOG_SQL_ORDER_tag order{1, SYSLOG_ATTRI_ID};
    for (int offset = 0; offset <= 500; offset += 50) {
        _SYSLOG_SQL_LIMIT_tag page{50, static_cast<uint64_t>(offset)};
        const Conditions range = {{SYSLOG_ATTRI_ID, SYSLOG_OP_GT, std::to_string(newest - offset - 50), {}},
                                  {SYSLOG_ATTRI_ID, SYSLOG_OP_LE, std::to_string(newest - offset), {}}};
        EXPECT_EQ(Select({}, &page, &order), Expected(range, {0, 0}, order));
    }
}

} // namespace
} // namespace kelo::test
