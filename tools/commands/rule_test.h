#pragma once

#include <cstdint>
#include <string>

#include "kelosyslog/records.h"
#include "read/log_table.h"

namespace kelo::tool {

// The test input of the rules; nothing for the newest stored records.
struct RuleTestOptions {
    bool hasSeverity = false;
    _SYSLOG_DB_PRIORITY_tag severity = SYSLOG_PRIO_EMERG;
    bool hasEps = false;
    uint64_t eps = 0;
    std::string text;
    LogTableOptions table;
    std::string lines;
    bool mustNotify = false;
    std::string format = "text";
};

// Prints the rules that fire, or the stored records for which a rule fires, and sends their notifications if
// requested. Returns an ExitStatus: kExitNothing when no rule fires.
int TestRules(const RuleTestOptions &options, const std::string &path, const std::string &root);

} // namespace kelo::tool
