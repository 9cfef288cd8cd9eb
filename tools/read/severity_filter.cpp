#include "read/severity_filter.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <optional>

#include "base/errors.h"

namespace kelo::tool {
namespace {

constexpr const char *kOption = "--priority";
// SQLite limits how deep an expression may be; every alternative adds a severity.
constexpr size_t kMaxValues = 500;

constexpr std::array<const char *, 24> kFacilities = {
    "kern",   "user",   "mail",     "daemon", "auth",   "syslog",   "lpr",     "news",
    "uucp",   "cron",   "authpriv", "ftp",    "ntp",    "security", "console", "solaris-cron",
    "local0", "local1", "local2",   "local3", "local4", "local5",   "local6",  "local7"};

_SYSLOG_DB_PRIORITY_tag ParseSeverity(const std::string &text, const std::string &whole) {
    if (text.size() == 1 && text[0] >= '0' && text[0] <= '7')
        return static_cast<_SYSLOG_DB_PRIORITY_tag>(text[0] - '0');
    if (text == "error")
        return SYSLOG_PRIO_ERR;
    if (text == "warn")
        return SYSLOG_PRIO_WARNING;
    if (text == "panic")
        return SYSLOG_PRIO_EMERG;
    for (int32_t severity = SYSLOG_PRIO_EMERG; severity <= SYSLOG_PRIO_DEBUG; ++severity) {
        if (text == g_MappingSyslogPrior[severity])
            return static_cast<_SYSLOG_DB_PRIORITY_tag>(severity);
    }
    throw UsageError(
        std::string(kOption) + ": '" + whole +
        "' is no level; levels are emerg, alert, crit, err, warning, notice, info, debug, 0 to 7, "
        "or a range such as warning..emerg");
}

void AddRange(std::vector<_SYSLOG_DB_PRIORITY_tag> &severities, int32_t from, int32_t to) {
    for (int32_t number = std::min(from, to); number <= std::max(from, to); ++number) {
        const auto severity = static_cast<_SYSLOG_DB_PRIORITY_tag>(number);
        if (std::find(severities.begin(), severities.end(), severity) == severities.end())
            severities.push_back(severity);
    }
}

void AddSeverities(std::vector<_SYSLOG_DB_PRIORITY_tag> &severities, const std::string &value,
                   bool withMoreSevere) {
    const size_t dots = value.find("..");
    if (dots != std::string::npos)
        AddRange(severities, ParseSeverity(value.substr(0, dots), value),
                 ParseSeverity(value.substr(dots + 2), value));
    else if (const int32_t severity = ParseSeverity(value, value); withMoreSevere)
        AddRange(severities, SYSLOG_PRIO_EMERG, severity);
    else
        AddRange(severities, severity, severity);
}

} // namespace

void RequireFewValues(const std::string &option, size_t count) {
    if (count > kMaxValues)
        throw UsageError(option + ": more than " + std::to_string(kMaxValues) + " values");
}

IncludeExclude SplitValues(const std::string &option, const std::vector<std::string> &values) {
    IncludeExclude filter;
    for (const std::string &value : values) {
        size_t begin = 0;
        while (begin <= value.size()) {
            const size_t end = std::min(value.find(',', begin), value.size());
            std::string piece = value.substr(begin, end - begin);
            const bool isExcluded = piece.starts_with('!');
            if (isExcluded)
                piece.erase(0, 1);
            if (piece.empty())
                throw UsageError(option + ": '" + value + "' holds an empty value");
            (isExcluded ? filter.excluded : filter.included).push_back(piece);
            begin = end + 1;
        }
    }
    RequireFewValues(option, filter.included.size() + filter.excluded.size());
    return filter;
}

SeverityFilter ParseSeverities(const std::vector<std::string> &values) {
    const IncludeExclude split = SplitValues(kOption, values);
    SeverityFilter severities;
    for (const std::string &value : split.included)
        AddSeverities(severities.included, value, split.included.size() == 1);
    for (const std::string &value : split.excluded)
        AddSeverities(severities.excluded, value, false);
    return severities;
}

std::vector<std::string> SeverityNames() {
    return {std::begin(g_MappingSyslogPrior), std::end(g_MappingSyslogPrior)};
}

std::vector<std::string> FacilityNames() {
    return {kFacilities.begin(), kFacilities.end()};
}

std::string FacilityName(const std::string &value) {
    size_t number = 0;
    const char *end = value.data() + value.size();
    const auto [stop, error] = std::from_chars(value.data(), end, number);
    return error == std::errc() && stop == end && number < kFacilities.size() ? kFacilities[number] : value;
}

} // namespace kelo::tool
