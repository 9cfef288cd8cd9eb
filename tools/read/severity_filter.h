#pragma once

#include <string>
#include <vector>

#include "kelosyslog/records.h"

namespace kelo::tool {

// The values of an option with alternatives, split into those to find and those to exclude.
struct IncludeExclude {
    std::vector<std::string> included;
    std::vector<std::string> excluded; // without their '!'
};

// Splits comma-separated values; a leading '!' excludes. Throws UsageError that names `option` for an empty
// value and for more values than one statement can hold.
IncludeExclude SplitValues(const std::string &option, const std::vector<std::string> &values);

// Throws UsageError that names `option` if one statement cannot hold as many values.
void RequireFewValues(const std::string &option, size_t count);

// The severities that --priority selects. If none is included, all but the excluded ones are.
struct SeverityFilter {
    std::vector<_SYSLOG_DB_PRIORITY_tag> included;
    std::vector<_SYSLOG_DB_PRIORITY_tag> excluded;
};

// Reads severities: names ("err", also "error", "warn", "panic"), numbers 0 to 7, and ranges "warning..emerg"
// in either direction. A single included severity means itself and everything more severe; one of several, an
// excluded one and the bound of a range mean themselves only. Throws UsageError.
SeverityFilter ParseSeverities(const std::vector<std::string> &values);

// The names of all severities, the most severe first, and of all facilities in the order of their numbers.
std::vector<std::string> SeverityNames();
std::vector<std::string> FacilityNames();

// The name of a facility for its number ("16" gives "local0"); any other text is already a name and is
// returned unchanged.
std::string FacilityName(const std::string &value);

} // namespace kelo::tool
