// Random searches over hostile rows, compared with a filter that knows nothing of SQL.

#include <algorithm>
#include <cctype>
#include <random>

#include "query/query_fixture.h"

using namespace kelo::test;

namespace {

using Row = std::map<_SYSLOG_DB_ATTRI_tag, std::string>;
using Texts = std::vector<std::string>;

const Texts kTexts = {"",   "nas", "NAS", "n",   "O'Brien", "''", "100%",  "1_0",  "a[b]c", "[",  "]",
                      "\\", "\\%", "a*b", "a?b", "-- x",    ";",  "\"n\"", "\t\n", "/*",    "10", "9"};
const Texts kPatterns = {"*",   "?",   "??",    "n*",   "*s",  "*n*s*", "N?s", "*'*",
                         "*[*", "[n*", "a[b]c", "*\\*", "*%*", "1_0",   "1?0", "*?*"};

bool Matches(const std::string &text, const std::string &pattern) {
    if (pattern.empty())
        return text.empty();
    if (pattern[0] == '*' && Matches(text, pattern.substr(1)))
        return true;
    if (text.empty())
        return false;
    if (pattern[0] == '*')
        return Matches(text.substr(1), pattern);
    return (pattern[0] == '?' || pattern[0] == text[0]) && Matches(text.substr(1), pattern.substr(1));
}

std::string Lower(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(), [](unsigned char c) { return std::tolower(c); });
    return text;
}

bool Meets(const Row &row, const _SYSLOG_SQL_COND_tag &condition) {
    const std::string &text = row.at(condition.attr);
    const int order = text.compare(condition.value);
    const bool isLike = Matches(Lower(text), Lower(condition.value));
    const bool isGlob = Matches(text, condition.value);
    const std::map<int, bool> results = {{SYSLOG_OP_EQ, order == 0}, {SYSLOG_OP_NE, order != 0},
                                         {SYSLOG_OP_LT, order < 0},  {SYSLOG_OP_LE, order <= 0},
                                         {SYSLOG_OP_GT, order > 0},  {SYSLOG_OP_GE, order >= 0},
                                         {SYSLOG_OP_LIKE, isLike},   {SYSLOG_OP_NOT_LIKE, !isLike},
                                         {SYSLOG_OP_GLOB, isGlob},   {SYSLOG_OP_NOT_GLOB, !isGlob}};
    const auto &others = condition.alternatives;
    return results.at(condition.op) ||
           std::any_of(others.begin(), others.end(), [&](const auto &other) { return Meets(row, other); });
}

class Differential : public QueryTest {
protected:
    size_t Below(size_t end) { return random_() % end; }
    std::string Of(const Texts &choices) { return choices[Below(choices.size())]; }

    _SYSLOG_SQL_COND_tag Condition(size_t alternatives) {
        constexpr _SYSLOG_DB_ATTRI_tag kColumns[] = {SYSLOG_ATTRI_HOST, SYSLOG_ATTRI_MSG};
        const auto op = static_cast<_SYSLOG_SQL_OP_tag>(Below(SYSLOG_OP_RAW));
        _SYSLOG_SQL_COND_tag condition{
            kColumns[Below(2)], op, Of(op < SYSLOG_OP_LIKE ? kTexts : kPatterns), {}};
        for (; alternatives > 0; --alternatives)
            condition.alternatives.push_back(Condition(0));
        return condition;
    }

    std::vector<uint64_t> Select(const Conditions &conditions, _SYSLOG_SQL_LIMIT_tag limit, bool ascending) {
        std::vector<uint64_t> ids;
        const auto collect = [](_SYSLOG_LOG_DATA_tag &log, void *context) {
            static_cast<std::vector<uint64_t> *>(context)->push_back(log.id);
            return 0;
        };
        _SYSLOG_SQL_ORDER_tag order{ascending, SYSLOG_ATTRI_ID};
        EXPECT_EQ(SyslogDBSelect(path_, conditions, &limit, &order, collect, &ids, false), 0);
        return ids;
    }

    std::mt19937 random_{20200102};
};

TEST_F(Differential, SearchesFindWhatANaiveFilterFinds) {
    std::map<uint64_t, Row> rows;
    std::vector<_SYSLOG_LOG_DATA_tag> logs(300);
    for (_SYSLOG_LOG_DATA_tag &log : logs) {
        log.host = Of(kTexts) + Of(kTexts);
        log.msg = Of(kTexts);
        rows[rows.size() + 1] = {{SYSLOG_ATTRI_HOST, log.host}, {SYSLOG_ATTRI_MSG, log.msg}};
    }
    InsertLogs(path_, logs);
    size_t found = 0;
    for (int round = 0; round < 500; ++round) {
        Conditions conditions;
        for (size_t count = 1 + Below(3); count > 0; --count)
            conditions.push_back(Condition(Below(4)));
        std::vector<uint64_t> expected;
        for (const auto &[id, row] : rows) {
            if (std::all_of(conditions.begin(), conditions.end(),
                            [&](const auto &c) { return Meets(row, c); }))
                expected.push_back(id);
        }
        found += expected.size();
        PlatformCalls::Reset();
        ASSERT_EQ(Select(conditions, {0, 0}, true), expected) << TakeStatement();
        ASSERT_EQ(SyslogDBSelectCount(path_, conditions, nullptr, nullptr),
                  static_cast<int>(expected.size()));
        std::reverse(expected.begin(), expected.end());
        const size_t offset = std::min(Below(5), expected.size()), limit = 1 + Below(20);
        std::vector<uint64_t> page(expected.begin() + static_cast<long>(offset), expected.end());
        page.resize(std::min(page.size(), limit));
        ASSERT_EQ(Select(conditions, {limit, offset}, false), page) << TakeStatement();
        if (round % 5 != 0 || expected.size() > 8)
            continue;
        ASSERT_EQ(SyslogDBDelete(path_, conditions), 0);
        for (const uint64_t id : expected)
            rows.erase(id);
        ASSERT_EQ(QueryText(path_, "SELECT count(*) FROM logs"), std::to_string(rows.size()));
    }
    EXPECT_GT(found, 5000u);
}

} // namespace
