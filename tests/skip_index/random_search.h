#pragma once

#include <functional>
#include <list>
#include <optional>
#include <string>

#include "kelosyslog/dbutil.h"
#include "random_text.h"

namespace kelo::test {

struct RandomSearch {
    std::string keyword;
    std::list<_SYSLOG_SQL_COND_tag> conditions;
    std::optional<_SYSLOG_SQL_ORDER_tag> order;
    std::optional<_SYSLOG_SQL_LIMIT_tag> limit;
};

// A search for parts of messages, which `part` gives, in any form that the library has.
RandomSearch MakeRandomSearch(Random &random, const std::function<std::string()> &part);

} // namespace kelo::test
