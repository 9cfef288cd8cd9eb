#include "comparison.h"

#include <algorithm>
#include <cstdlib>
#include <list>

#include "keloplatform/skip_index.h"
#include "kelosyslog/dbutil.h"

namespace kelo::test {
namespace {

int Take(_SYSLOG_LOG_DATA_tag &log, void *context) {
    static_cast<Answer *>(context)->rows.push_back(std::to_string(log.id) + " " + log.msg);
    return 0;
}

class IndexSwitch {
public:
    explicit IndexSwitch(WithIndex withIndex) {
        if (withIndex == WithIndex::kNo)
            setenv("KELO_SKIP_INDEX", "off", 1);
    }
    ~IndexSwitch() { unsetenv("KELO_SKIP_INDEX"); }
    IndexSwitch(const IndexSwitch &) = delete;
    IndexSwitch &operator=(const IndexSwitch &) = delete;
};

bool wasServed = false;

// Whether all of `part` is in `whole`, as often.
bool Includes(std::vector<std::string> whole, std::vector<std::string> part) {
    std::sort(whole.begin(), whole.end());
    std::sort(part.begin(), part.end());
    return std::includes(whole.begin(), whole.end(), part.begin(), part.end());
}

} // namespace

Answer Ask(const std::string &path, RandomSearch &search, WithIndex withIndex) {
    const IndexSwitch index(withIndex);
    Answer answer;
    _SYSLOG_SQL_LIMIT_tag *limit = search.limit ? &*search.limit : nullptr;
    _SYSLOG_SQL_ORDER_tag *order = search.order ? &*search.order : nullptr;
    KELODBSkipIndexLag();
    answer.status = SyslogDBSelect(path, search.conditions, limit, order, Take, &answer, false);
    if (limit == nullptr)
        answer.count = SyslogDBSelectCount(path, search.conditions, nullptr, order);
    wasServed = KELODBSkipIndexLag() >= 0;
    return answer;
}

std::string ValuesOf(const std::string &path, const std::string &column, WithIndex withIndex) {
    const IndexSwitch index(withIndex);
    std::list<std::string> values;
    std::string text = std::to_string(SyslogDBAttriValueGet(path, column, nullptr, values));
    for (const std::string &value : values)
        text.append(" ").append(value);
    return text;
}

bool WasServed() {
    return wasServed;
}

bool IsBetween(const Answer &found, const Answer &before, const Answer &after) {
    return found.status == before.status && found.status == after.status && found.count <= before.count &&
           found.count >= after.count && Includes(before.rows, found.rows) &&
           Includes(found.rows, after.rows);
}

std::string Difference(const RandomSearch &search, const Answer &found, const Answer &expected) {
    const auto sizes = [](const Answer &answer) {
        return std::to_string(answer.rows.size()) + " rows (count " + std::to_string(answer.count) +
               ", status " + std::to_string(answer.status) + ")";
    };
    std::string clause;
    LogSearchClauseGet(search.conditions, clause);
    std::string text =
        sizes(found) + " instead of " + sizes(expected) + " for keyword [" + search.keyword + "]: " + clause;
    if (search.order)
        text +=
            " order " + std::to_string(search.order->attr) + " " + std::to_string(search.order->ascending);
    if (search.limit)
        text += " limit " + std::to_string(search.limit->limit) + " offset " +
                std::to_string(search.limit->offset);
    return text;
}

} // namespace kelo::test
