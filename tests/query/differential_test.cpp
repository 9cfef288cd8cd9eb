// Random searches over hostile rows, compared with a filter that knows nothing of SQL.

#include "query/query_fixture.h"

using namespace kelo::test;

namespace {

using Field = std::optional<std::string>; // without a value: NULL
using Row = std::map<int32_t, Field>;     // by attribute

const std::vector<_SYSLOG_DB_ATTRI_tag> kTextColumns = {SYSLOG_ATTRI_HOST, SYSLOG_ATTRI_PROG,
                                                        SYSLOG_ATTRI_MSG, SYSLOG_ATTRI_TAG};
const std::vector<std::string> kTexts = {"",     "nas",   "NAS", "n",   "na",    "O'Brien", "''", "100%",
                                         "1_0",  "a[b]c", "[",   "]",   "[nas]", "a\\b",    "\\", "\\%",
                                         "grün", "日本",  "日",  "a*b", "a?b",   "-- x",    ";",  "\"n\"",
                                         "\t\n", "nas01", "/*",  "10",  "9"};
const std::vector<std::string> kPatterns = {"*",   "?",   "??",  "n*",    "*s",   "*n*s*", "N?s",
                                            "*'*", "*[*", "[n*", "a[b]c", "*\\*", "*%*",   "1_0",
                                            "1?0", "*本", "?本", "gr?n",  "*\"",  "**",    "*?*"};

// One character of UTF-8, as it counts for '?'.
size_t CharacterLength(const std::string &text, size_t at) {
    size_t length = 1;
    while (at + length < text.size() && (static_cast<unsigned char>(text[at + length]) & 0xC0) == 0x80)
        ++length;
    return length;
}

bool Matches(const std::string &text, size_t at, const std::string &pattern, size_t from) {
    if (from == pattern.size())
        return at == text.size();
    if (pattern[from] == '*') {
        for (size_t end = at; end <= text.size(); ++end) {
            if (Matches(text, end, pattern, from + 1))
                return true;
        }
        return false;
    }
    if (at == text.size())
        return false;
    if (pattern[from] == '?')
        return Matches(text, at + CharacterLength(text, at), pattern, from + 1);
    return text[at] == pattern[from] && Matches(text, at + 1, pattern, from + 1);
}

std::string LowerAscii(std::string text) {
    for (char &byte : text)
        byte = byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte + 32) : byte;
    return text;
}

bool Holds(_SYSLOG_SQL_OP_tag op, int order) {
    const bool results[] = {order == 0, order != 0, order<0, order <= 0, order> 0, order >= 0};
    return results[op];
}

bool Meets(const Row &row, const _SYSLOG_SQL_COND_tag &condition) {
    const Field &field = row.at(condition.attr);
    if (!field)
        return false;
    if (condition.attr == SYSLOG_ATTRI_ID || condition.attr == SYSLOG_ATTRI_UTCSEC) {
        const long long left = std::stoll(*field), right = std::stoll(condition.value);
        return Holds(condition.op, left < right ? -1 : left > right);
    }
    if (condition.op < SYSLOG_OP_LIKE)
        return Holds(condition.op, field->compare(condition.value));
    const bool isExcluded = condition.op == SYSLOG_OP_NOT_LIKE || condition.op == SYSLOG_OP_NOT_GLOB;
    if (condition.op >= SYSLOG_OP_GLOB)
        return Matches(*field, 0, condition.value, 0) != isExcluded;
    return Matches(LowerAscii(*field), 0, LowerAscii(condition.value), 0) != isExcluded;
}

bool MeetsAll(const Row &row, const Conditions &conditions) {
    return std::all_of(conditions.begin(), conditions.end(), [&](const _SYSLOG_SQL_COND_tag &condition) {
        const auto &alternatives = condition.alternatives;
        return Meets(row, condition) || std::any_of(alternatives.begin(), alternatives.end(),
                                                    [&](const auto &other) { return Meets(row, other); });
    });
}

class Random {
public:
    int Below(int end) { return static_cast<int>(engine_() % static_cast<unsigned>(end)); }
    bool OneIn(int times) { return Below(times) == 0; }
    template <typename T>
    const T &Of(const std::vector<T> &choices) {
        return choices[static_cast<size_t>(Below(static_cast<int>(choices.size())))];
    }

    _SYSLOG_SQL_COND_tag Comparison() {
        if (OneIn(5)) {
            const auto op = static_cast<_SYSLOG_SQL_OP_tag>(Below(SYSLOG_OP_LIKE));
            return {
                OneIn(2) ? SYSLOG_ATTRI_ID : SYSLOG_ATTRI_UTCSEC, op, std::to_string(Below(600) - 20), {}};
        }
        const auto op = static_cast<_SYSLOG_SQL_OP_tag>(Below(SYSLOG_OP_RAW));
        const bool isPattern = op >= SYSLOG_OP_LIKE && !OneIn(4);
        return {Of(kTextColumns), op, isPattern ? Of(kPatterns) : Of(kTexts), {}};
    }

    Conditions List() {
        Conditions conditions;
        for (int count = 1 + Below(3); count > 0; --count) {
            conditions.push_back(Comparison());
            for (int others = OneIn(2) ? Below(4) : 0; others > 0; --others)
                conditions.back().alternatives.push_back(Comparison());
        }
        return conditions;
    }

private:
    std::mt19937 engine_{20200102};
};

class Differential : public QueryTest {
protected:
    Differential() {
        std::vector<_SYSLOG_LOG_DATA_tag> logs;
        for (int number = 1; number <= 500; ++number) {
            Row row;
            for (const _SYSLOG_DB_ATTRI_tag column : kTextColumns)
                row[column] = random_.Of(kTexts) + (random_.OneIn(2) ? "" : random_.Of(kTexts));
            row[SYSLOG_ATTRI_ID] = std::to_string(number);
            row[SYSLOG_ATTRI_UTCSEC] =
                std::to_string(number * 211 % 503); // unique, in another order than the ids
            _SYSLOG_LOG_DATA_tag log;
            log.host = *row[SYSLOG_ATTRI_HOST];
            log.prog = *row[SYSLOG_ATTRI_PROG];
            log.msg = *row[SYSLOG_ATTRI_MSG];
            log.tag = *row[SYSLOG_ATTRI_TAG];
            log.utcsec = std::stoll(*row[SYSLOG_ATTRI_UTCSEC]);
            logs.push_back(log);
            if (number % 7 == 0)
                row[SYSLOG_ATTRI_PROG].reset();
            rows_.push_back(row);
        }
        InsertLogs(path_, logs);
        RunSql(path_, "UPDATE logs SET prog = NULL WHERE id % 7 = 0");
    }

    std::vector<uint64_t> Select(const Conditions &conditions, _SYSLOG_SQL_LIMIT_tag *limit,
                                 _SYSLOG_SQL_ORDER_tag *order) {
        std::vector<uint64_t> ids;
        const auto collect = [](_SYSLOG_LOG_DATA_tag &log, void *context) {
            static_cast<std::vector<uint64_t> *>(context)->push_back(log.id);
            return 0;
        };
        EXPECT_EQ(SyslogDBSelect(path_, conditions, limit, order, collect, &ids, false), 0);
        return ids;
    }

    std::vector<uint64_t> Expected(const Conditions &conditions, const _SYSLOG_SQL_LIMIT_tag &limit,
                                   const _SYSLOG_SQL_ORDER_tag &order) const {
        std::vector<std::pair<long long, uint64_t>> found; // sort key, id
        for (const Row &row : rows_) {
            if (MeetsAll(row, conditions))
                found.emplace_back(std::stoll(*row.at(order.attr)), std::stoull(*row.at(SYSLOG_ATTRI_ID)));
        }
        std::sort(found.begin(), found.end());
        if (order.ascending == 0)
            std::reverse(found.begin(), found.end());
        std::vector<uint64_t> ids;
        for (size_t i = limit.offset; i < found.size() && (limit.limit == 0 || ids.size() < limit.limit); ++i)
            ids.push_back(found[i].second);
        return ids;
    }

    Random random_;
    std::vector<Row> rows_;
};

TEST_F(Differential, SearchesFindWhatANaiveFilterFinds) {
    size_t found = 0, deleted = 0;
    for (int round = 0; round < 1000; ++round) {
        const Conditions conditions = random_.List();
        _SYSLOG_SQL_LIMIT_tag limit{static_cast<uint64_t>(random_.Below(20)),
                                    static_cast<uint64_t>(random_.Below(5))};
        _SYSLOG_SQL_ORDER_tag order{random_.Below(2),
                                    random_.OneIn(2) ? SYSLOG_ATTRI_ID : SYSLOG_ATTRI_UTCSEC};
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
        std::erase_if(rows_, [&](const Row &row) { return MeetsAll(row, conditions); });
        ASSERT_EQ(RunSql(path_, "SELECT count(*) FROM logs"), std::to_string(rows_.size()))
            << TakeStatement();
    }
    EXPECT_GT(found, 10000u);
    EXPECT_GT(deleted, 50u) << found;

    // Without a filter a page is a range of ids, and thinner where rows were deleted.
    const uint64_t newest = std::stoull(*rows_.back().at(SYSLOG_ATTRI_ID));
    _SYSLOG_SQL_ORDER_tag order{1, SYSLOG_ATTRI_ID};
    for (uint64_t offset = 0; offset <= 500; offset += 50) {
        _SYSLOG_SQL_LIMIT_tag page{50, offset};
        const auto below = [](uint64_t a, uint64_t b) { return std::to_string(a > b ? a - b : 0); };
        const Conditions range = {{SYSLOG_ATTRI_ID, SYSLOG_OP_GT, below(newest, offset + 50), {}},
                                  {SYSLOG_ATTRI_ID, SYSLOG_OP_LE, below(newest, offset), {}}};
        EXPECT_EQ(Select({}, &page, &order), Expected(range, {0, 0}, order));
    }
}

} // namespace
