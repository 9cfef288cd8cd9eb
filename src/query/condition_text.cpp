#include "query/condition_text.h"

#include <algorithm>
#include <cstring>
#include <new>

#include "common/attributes.h"
#include "keloplatform/kelodb.h"

namespace kelo {
namespace {

bool IsLike(_SYSLOG_SQL_OP_tag op) {
    return op == SYSLOG_OP_LIKE || op == SYSLOG_OP_NOT_LIKE;
}

bool IsGlob(_SYSLOG_SQL_OP_tag op) {
    return op == SYSLOG_OP_GLOB || op == SYSLOG_OP_NOT_GLOB;
}

bool HasColumn(_SYSLOG_DB_ATTRI_tag attr) {
    return attr >= SYSLOG_ATTRI_ID && attr < SYSLOG_ATTRI_NONE;
}

// A lone '!' is not an SQL token, so a condition that cannot be expressed is an error in any position.
const char *OperatorText(_SYSLOG_SQL_OP_tag op) {
    const bool hasText = op >= SYSLOG_OP_EQ && op < SYSLOG_OP_RAW;
    return hasText ? g_MappingSyslogOP[op] : "! operator";
}

// Runs a platform escape function, which writes at most two bytes for one, over a text of `length` bytes.
// Returns "" when it fails.
template <typename EscapeFunction>
std::string Escaped(size_t length, EscapeFunction escape) {
    std::string buffer(2 * length + 1, '\0');
    if (escape(buffer.data(), buffer.size()) < 0)
        return "";
    // The C string is used, not the length that the function reports.
    buffer.resize(strnlen(buffer.data(), buffer.size()));
    return buffer;
}

std::string EscapedForSql(const std::string &value) {
    return Escaped(value.size(), [&](char *out, size_t size) {
        return KELODBEscapeStringEX2(nullptr, out, size, value.data(), value.size());
    });
}

// The user's own '%' and '_' are escaped first, so that only the translated '*' and '?' are wildcards.
std::string LikePattern(const std::string &text) {
    std::string pattern = Escaped(text.size(), [&](char *out, size_t size) {
        return KELODBEscapeBackslashEX2(nullptr, out, size, text.c_str());
    });
    std::replace(pattern.begin(), pattern.end(), '*', '%');
    std::replace(pattern.begin(), pattern.end(), '?', '_');
    return pattern;
}

// Brackets become sets of one character, so that they match themselves.
std::string GlobPattern(const std::string &text) {
    std::string pattern;
    pattern.reserve(text.size());
    for (const char byte : text) {
        if (byte == '[' || byte == ']')
            pattern.append({'[', byte, ']'});
        else
            pattern += byte;
    }
    return pattern;
}

void AppendComparison(const _SYSLOG_SQL_COND_tag &condition, std::string &out) {
    const std::string value = SyslogSQLCondValueEscape(&condition);
    out.append("(").append(ColumnText(condition.attr)).append(" ");
    out.append(OperatorText(condition.op)).append(" ");
    if (HasColumn(condition.attr) && IsIntegerAttribute(condition.attr))
        out.append(value).append(")");
    else if (IsLike(condition.op))
        out.append("'").append(value).append("' escape '\\')");
    else
        out.append("'").append(value).append("')");
}

bool IsRaw(const _SYSLOG_SQL_COND_tag &condition) {
    return condition.op == SYSLOG_OP_RAW && HasColumn(condition.attr) && !IsIntegerAttribute(condition.attr);
}

} // namespace

const char *ColumnText(_SYSLOG_DB_ATTRI_tag attr) {
    return HasColumn(attr) ? LogAttriStrGet(attr) : "! attribute";
}

bool IsMatchAll(const std::string &body) {
    return body.empty() || body == "(msg GLOB '**')";
}

std::string SyslogSQLCondValueEscape(const _SYSLOG_SQL_COND_tag *condition) {
    if (condition == nullptr)
        return "";
    try {
        const std::string text = EscapedForSql(condition->value);
        if (IsLike(condition->op))
            return LikePattern(text);
        return IsGlob(condition->op) ? GlobPattern(text) : text;
    } catch (const std::bad_alloc &) {
        return "";
    }
}

int SyslogSQLCondStrGen(const _SYSLOG_SQL_COND_tag &condition, std::string &out) {
    out.clear();
    if (!condition.alternatives.empty())
        out.append("(");
    if (IsRaw(condition))
        out.append("(").append(condition.value).append(")");
    else
        AppendComparison(condition, out);
    for (const _SYSLOG_SQL_COND_tag &alternative : condition.alternatives) {
        out.append(" OR ");
        AppendComparison(alternative, out);
    }
    if (!condition.alternatives.empty())
        out.append(")");
    return 0;
}

int SyslogSQLCondListStrGen(const std::list<_SYSLOG_SQL_COND_tag> &conditions, std::string &out) {
    const char *separator = "";
    std::string text;
    for (const _SYSLOG_SQL_COND_tag &condition : conditions) {
        out.append(separator);
        if (SyslogSQLCondStrGen(condition, text) != 0)
            return -1;
        out.append(text);
        separator = " AND ";
    }
    return 0;
}

} // namespace kelo
