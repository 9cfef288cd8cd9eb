#include "read/selection.h"

#include <ctime>

#include "base/errors.h"
#include "read/level_selection.h"
#include "read/log_message_capture.h"
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

void AddValues(Conditions &conditions, _SYSLOG_DB_ATTRI_tag attr, const ValueSelection &values) {
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

void AddLevels(Conditions &conditions, const std::vector<std::string> &values) {
    const LevelSelection levels = ParseLevels(values);
    ValueSelection words;
    for (const _SYSLOG_DB_PRIORITY_tag level : levels.included)
        words.included.emplace_back(g_MappingSyslogPrior[level]);
    for (const _SYSLOG_DB_PRIORITY_tag level : levels.excluded)
        words.excluded.emplace_back(g_MappingSyslogPrior[level]);
    AddValues(conditions, SYSLOG_ATTRI_LLEVEL, words);
}

void AddFacilities(Conditions &conditions, const std::vector<std::string> &values) {
    ValueSelection words = SplitValues("--facility", values);
    for (std::string &word : words.included)
        word = FacilityName(word);
    for (std::string &word : words.excluded)
        word = FacilityName(word);
    AddValues(conditions, SYSLOG_ATTRI_FAC, words);
}

void AddKeyword(Conditions &conditions, const std::string &keyword) {
    if (keyword.find_first_not_of(" \t\n") == std::string::npos)
        throw UsageError("--grep: empty keyword");
    LogMessageCapture capture;
    LogSearchCondListGen("", "", "", "", keyword, "", "", conditions);
    const std::string complaint = capture.FirstLine();
    if (!complaint.empty())
        throw UsageError("--grep: '" + keyword + "': " + complaint);
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

void RequireColumn(bool isUsed, const char *option, const char *column, const LogSource &source) {
    if (isUsed)
        throw UsageError(std::string(option) + ": table " + source.table + " has no column '" + column + "'");
}

} // namespace

bool IsEmpty(const Selection &selection) {
    return selection.since.empty() && selection.until.empty() && selection.levels.empty() &&
           selection.facilities.empty() && selection.hosts.empty() && selection.programs.empty() &&
           selection.keywords.empty();
}

std::optional<int64_t> LastSecond(const Selection &selection, int64_t now) {
    if (selection.until.empty())
        return std::nullopt;
    const Moment until = ParseTimeExpression("--until", selection.until, now);
    return until.isDayOnly ? until.seconds - 1 : until.seconds;
}

std::list<_SYSLOG_SQL_COND_tag> MakeConditions(const Selection &selection, const LogSource &source,
                                               int64_t now) {
    RequireColumn(source.kind != TableKind::Logs && !selection.facilities.empty(), "--facility", "fac",
                  source);
    RequireColumn(source.kind == TableKind::Transfer && !selection.levels.empty(), "--priority", "llevel",
                  source);
    RequireColumn(source.kind == TableKind::Transfer && !selection.keywords.empty(), "--grep", "msg", source);
    Conditions conditions;
    AddValues(conditions, SYSLOG_ATTRI_HOST, SplitValues("--host", selection.hosts));
    AddLevels(conditions, selection.levels);
    AddFacilities(conditions, selection.facilities);
    AddValues(conditions, SYSLOG_ATTRI_PROG, SplitValues("--program", selection.programs));
    for (const std::string &keyword : selection.keywords)
        AddKeyword(conditions, keyword);
    if (!selection.since.empty()) {
        const Moment since = ParseTimeExpression("--since", selection.since, now);
        AddTimeBound(conditions, source.kind, SYSLOG_OP_GE, since.seconds);
    }
    if (const std::optional<int64_t> last = LastSecond(selection, now))
        AddTimeBound(conditions, source.kind, SYSLOG_OP_LE, *last);
    return conditions;
}

} // namespace kelo::tool
