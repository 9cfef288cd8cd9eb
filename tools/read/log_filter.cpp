#include "read/log_filter.h"

#include <ctime>

#include "base/errors.h"
#include "keloplatform/errors.h"
#include "read/severity_filter.h"
#include "read/time_expression.h"

namespace kelo::tool {
namespace {

using Condition = _SYSLOG_SQL_COND_tag;
using Conditions = std::list<Condition>;

bool IsPattern(const std::string &value) {
    return value.find_first_of("*?") != std::string::npos;
}

std::string SqlText(const std::string &value) {
    std::string text = "'";
    for (const char byte : value) {
        text += byte;
        if (byte == '\'')
            text += byte;
    }
    return text + "'";
}

std::string GlobText(const std::string &value) {
    std::string text;
    for (const char byte : value) {
        if (byte == '[' || byte == ']')
            ((text += '[') += byte) += ']';
        else
            text += byte;
    }
    return SqlText(text);
}

Condition RawCondition(const std::string &sql) {
    return {SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, sql, {}}; // the attribute does not show
}

// A plain "!=" would drop the rows whose column is NULL together with the excluded ones.
Condition Exclusion(const std::string &column, const std::string &value) {
    if (IsPattern(value))
        return RawCondition(column + " IS NULL OR " + column + " NOT GLOB " + GlobText(value));
    return RawCondition(column + " IS NOT " + SqlText(value));
}

void AddValues(Conditions &conditions, _SYSLOG_DB_ATTRI_tag attr, const IncludeExclude &values) {
    Condition anyOf;
    for (const std::string &value : values.included) {
        const Condition one{attr, IsPattern(value) ? SYSLOG_OP_GLOB : SYSLOG_OP_EQ, value, {}};
        if (&value == &values.included.front())
            anyOf = one;
        else
            anyOf.alternatives.push_back(one);
    }
    if (!values.included.empty())
        conditions.push_back(anyOf);
    for (const std::string &value : values.excluded)
        conditions.push_back(Exclusion(LogAttriStrGet(attr), value));
}

// The values as they are: nothing in them has a meaning.
void AddNames(Conditions &conditions, _SYSLOG_DB_ATTRI_tag attr, const std::string &option,
              const std::vector<std::string> &names, const std::vector<std::string> &otherNames) {
    RequireFewValues(option, names.size() + otherNames.size());
    std::string anyOf;
    for (const std::string &name : names)
        anyOf += (anyOf.empty() ? "" : ",") + SqlText(name);
    if (!names.empty())
        conditions.push_back(RawCondition(LogAttriStrGet(attr) + (" IN (" + anyOf + ")")));
    for (const std::string &name : otherNames)
        conditions.push_back(RawCondition(LogAttriStrGet(attr) + (" IS NOT " + SqlText(name))));
}

void AddSeverities(Conditions &conditions, const std::vector<std::string> &values) {
    const SeverityFilter severities = ParseSeverities(values);
    IncludeExclude words;
    for (const _SYSLOG_DB_PRIORITY_tag severity : severities.included)
        words.included.emplace_back(g_MappingSyslogPrior[severity]);
    for (const _SYSLOG_DB_PRIORITY_tag severity : severities.excluded)
        words.excluded.emplace_back(g_MappingSyslogPrior[severity]);
    AddValues(conditions, SYSLOG_ATTRI_LLEVEL, words);
}

void AddFacilities(Conditions &conditions, const std::vector<std::string> &values) {
    IncludeExclude words = SplitValues("--facility", values);
    for (std::string &word : words.included)
        word = FacilityName(word);
    for (std::string &word : words.excluded)
        word = FacilityName(word);
    AddValues(conditions, SYSLOG_ATTRI_FAC, words);
}

void AddKeyword(Conditions &conditions, const std::string &keyword) {
    if (keyword.find_first_not_of(" \t\n") == std::string::npos)
        throw UsageError("--grep: empty keyword");
    LogSearchCondListGen("", "", "", "", keyword, "", "", conditions);
    const std::string error = KELOKeywordError(keyword);
    if (!error.empty())
        throw UsageError("--grep: '" + keyword + "': " + error);
}

std::string LocalTimestamp(int64_t seconds) {
    const auto time = static_cast<time_t>(seconds);
    tm parts{};
    char text[64];
    if (localtime_r(&time, &parts) == nullptr)
        return "";
    return {text, std::strftime(text, sizeof text, "%Y/%m/%d %H:%M:%S", &parts)};
}

void AddTimeBound(Conditions &conditions, TableKind kind, _SYSLOG_SQL_OP_tag op, int64_t seconds) {
    if (kind == TableKind::Logs) {
        conditions.push_back({SYSLOG_ATTRI_UTCSEC, op, std::to_string(seconds), {}});
    } else {
        conditions.push_back(RawCondition("ldate || ' ' || ltime " + std::string(g_MappingSyslogOP[op]) +
                                          " " + SqlText(LocalTimestamp(seconds))));
    }
}

void RequireColumn(bool isUsed, const char *option, const char *column, const LogTable &table) {
    if (isUsed)
        throw UsageError(std::string(option) + ": table " + table.name + " has no column '" + column + "'");
}

} // namespace

bool IsEmpty(const LogFilter &filter) {
    return filter.since.empty() && filter.until.empty() && filter.severities.empty() &&
           filter.facilities.empty() && filter.hosts.empty() && filter.programs.empty() &&
           filter.keywords.empty() && filter.hostNames.empty() && filter.otherHostNames.empty() &&
           filter.programNames.empty() && filter.otherProgramNames.empty();
}

std::optional<int64_t> LastSecond(const LogFilter &filter, int64_t now) {
    if (filter.until.empty())
        return std::nullopt;
    const Moment until = ParseTimeExpression("--until", filter.until, now);
    return until.isDayOnly ? until.seconds - 1 : until.seconds;
}

std::list<_SYSLOG_SQL_COND_tag> MakeConditions(const LogFilter &filter, const LogTable &table, int64_t now) {
    RequireColumn(table.kind != TableKind::Logs && !filter.facilities.empty(), "--facility", "fac", table);
    RequireColumn(table.kind == TableKind::Transfer && !filter.severities.empty(), "--priority", "llevel",
                  table);
    RequireColumn(table.kind == TableKind::Transfer && !filter.keywords.empty(), "--grep", "msg", table);
    Conditions conditions;
    AddValues(conditions, SYSLOG_ATTRI_HOST, SplitValues("--host", filter.hosts));
    AddSeverities(conditions, filter.severities);
    AddFacilities(conditions, filter.facilities);
    AddValues(conditions, SYSLOG_ATTRI_PROG, SplitValues("--program", filter.programs));
    AddNames(conditions, SYSLOG_ATTRI_HOST, "--host-is", filter.hostNames, filter.otherHostNames);
    AddNames(conditions, SYSLOG_ATTRI_PROG, "--program-is", filter.programNames, filter.otherProgramNames);
    for (const std::string &keyword : filter.keywords)
        AddKeyword(conditions, keyword);
    if (!filter.since.empty()) {
        const Moment since = ParseTimeExpression("--since", filter.since, now);
        AddTimeBound(conditions, table.kind, SYSLOG_OP_GE, since.seconds);
    }
    if (const std::optional<int64_t> last = LastSecond(filter, now))
        AddTimeBound(conditions, table.kind, SYSLOG_OP_LE, *last);
    return conditions;
}

} // namespace kelo::tool
