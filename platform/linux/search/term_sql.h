#pragma once

#include <string>
#include <vector>

#include "search/keyword.h"

namespace kelo::platform {

// A regex that RE2 refuses, and why.
struct BrokenRegex {
    std::string regex;
    std::string reason;
};

// SQL that is true for the rows whose `column` matches the term, usable as an operand of AND and OR. A
// NULL is matched by exclusions only. A term with an invalid regex gives "0" whether it excludes or not, so
// that a mistake never widens a search, and is appended to `broken`.
std::string TermSql(const Term &term, const std::string &column, std::vector<BrokenRegex> &broken);

// The condition that every text matches.
std::string MatchAllSql(const std::string &column);

} // namespace kelo::platform
