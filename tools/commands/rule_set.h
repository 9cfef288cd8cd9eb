#pragma once

#include <string>
#include <vector>

#include "kelosyslog/notification.h"

namespace kelo::tool {

enum RuleType : int32_t { kSeverityRule = 0, kEpsRule = 1, kKeywordRule = 2 };

// The rules of a rule file as the log server loads them: up to the first section that cannot be read.
struct RuleSet {
    std::vector<_SYSLOG_NOTIFY_RULES_tag> rules;
    std::string broken; // name of the section that ended the loading; "" for none

    const _SYSLOG_NOTIFY_RULES_tag *Find(const std::string &name) const;
    bool IsBroken(const std::string &name) const { return !broken.empty() && name == broken; }
    // Throws DatabaseError when the loading ended early, because an unknown rule may then exist.
    void RequireReadable(const std::string &path) const;
};

// A missing file has no rules. Throws DatabaseError when it cannot be read.
RuleSet LoadRules(const std::string &path);

// "text" or "json". Throws UsageError for any other.
bool IsJson(const std::string &format);

// The condition of the rule: "severity err and worse", "500 logs a second and more", "message with disk
// full".
std::string DescribeRule(const _SYSLOG_NOTIFY_RULES_tag &rule);

// Prints the rules; returns an ExitStatus.
int PrintRules(const RuleSet &rules, const std::string &path, const std::string &format);

} // namespace kelo::tool
