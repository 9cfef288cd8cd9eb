#pragma once

#include <cstdint>
#include <list>
#include <optional>
#include <string>
#include <vector>

#include "kelosyslog/dbutil.h"
#include "read/log_table.h"

namespace kelo::tool {

// The records that a command selects, as the user wrote it. Values of one option are alternatives; all
// options together must match.
struct LogFilter {
    std::string since = {}; // "" for no bound
    std::string until = {};
    std::vector<std::string> severities = {};
    std::vector<std::string> facilities = {};
    std::vector<std::string> hosts = {};
    std::vector<std::string> programs = {};
    // Exactly these, without wildcards; and none of those.
    std::vector<std::string> hostNames = {};
    std::vector<std::string> otherHostNames = {};
    std::vector<std::string> programNames = {};
    std::vector<std::string> otherProgramNames = {};
    std::vector<std::string> keywords = {};
};

bool IsEmpty(const LogFilter &filter);

// The last second that --until includes, if it was given: a day alone ends before it begins.
std::optional<int64_t> LastSecond(const LogFilter &filter, int64_t now);

// The conditions for these records in a table of this kind, to combine with AND; none for an empty filter.
//
// A host, program or facility with '*' or '?' is a pattern. An exclusion keeps rows without a value. Table
// "logs" is limited by its `utcsec`; the others, which have none, by their `ldate` and `ltime`, which are
// read as local time.
//
// Throws UsageError for a value that cannot be read, a broken regular expression, and an option whose column
// the table does not have.
std::list<_SYSLOG_SQL_COND_tag> MakeConditions(const LogFilter &filter, const LogTable &table, int64_t now);

} // namespace kelo::tool
