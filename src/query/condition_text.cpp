#include "query/condition_text.h"

#include <algorithm>
#include <cstring>
#include <new>
#include <optional>

#include "common/attributes.h"
#include "common/failure.h"
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
// Nothing when it fails.
template <typename EscapeFunction>
std::optional<std::string> Escaped(size_t length, EscapeFunction escape) {
    std::string buffer(2 * length + 1, '\0');
    if (escape(buffer.data(), buffer.size()) < 0)
        return std::nullopt;
    // What counts is the C string, whatever length the function reports.
    buffer.resize(strnlen(buffer.data(), buffer.size()));
    return buffer;
}

std::optional<std::string> EscapedForSql(const std::string &value) {
    return Escaped(value.size(), [&](char *out, size_t size) {
        return KELODBEscapeStringEX2(nullptr, out, size, value.data(), value.size());
    });
}

// The user's own '%' and '_' are escaped first, so that only the translated '*' and '?' are wildcards.
std::optional<std::string> LikePattern(const std::string &text) {
    std::optional<std::string> pattern = Escaped(text.size(), [&](char *out, size_t size) {
        return KELODBEscapeBackslashEX2(nullptr, out, size, text.c_str());
    });
    if (pattern) {
        std::replace(pattern->begin(), pattern->end(), '*', '%');
        std::replace(pattern->begin(), pattern->end(), '?', '_');
    }
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

// The escaped value of a condition; nothing when an escape function fails or memory runs out.
std::optional<std::string> EscapedValue(const _SYSLOG_SQL_COND_tag &condition) {
    try {
        std::optional<std::string> text = EscapedForSql(condition.value);
        if (text && IsLike(condition.op))
            return LikePattern(*text);
        return text && IsGlob(condition.op) ? GlobPattern(*text) : text;
    } catch (const std::bad_alloc &) {
        return std::nullopt;
    }
}

bool HoldsNul(const _SYSLOG_SQL_COND_tag &condition) {
    return condition.value.find('\0') != std::string::npos;
}

bool FailForNul(const _SYSLOG_SQL_COND_tag &condition) {
    Fail(KELO_FAILURE_ARGUMENT, "", condition.value, "the value of a condition holds a NUL byte");
    return false;
}

// False when the condition cannot be rendered.
bool AppendComparison(const _SYSLOG_SQL_COND_tag &condition, LostValue lost, std::string &out) {
    const std::optional<std::string> value = EscapedValue(condition);
    if (HoldsNul(condition))
        return FailForNul(condition);
    if (!value && lost == LostValue::IsFailure) {
        Fail(KELO_FAILURE_MEMORY, "", condition.value, "the value of a condition cannot be escaped");
        return false;
    }
    out.append("(").append(ColumnText(condition.attr)).append(" ");
    out.append(OperatorText(condition.op)).append(" ");
    if (HasColumn(condition.attr) && IsIntegerAttribute(condition.attr))
        out.append(value.value_or("")).append(")");
    else if (IsLike(condition.op))
        out.append("'").append(value.value_or("")).append("' escape '\\')");
    else
        out.append("'").append(value.value_or("")).append("')");
    return true;
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
    return condition != nullptr ? EscapedValue(*condition).value_or("") : "";
}

int SyslogSQLCondStrGen(const _SYSLOG_SQL_COND_tag &condition, std::string &out, LostValue lost) {
    out.clear();
    if (!condition.alternatives.empty())
        out.append("(");
    if (IsRaw(condition)) {
        if (HoldsNul(condition) && !FailForNul(condition))
            return -1;
        out.append("(").append(condition.value).append(")");
    } else if (!AppendComparison(condition, lost, out)) {
        return -1;
    }
    for (const _SYSLOG_SQL_COND_tag &alternative : condition.alternatives) {
        out.append(" OR ");
        if (!AppendComparison(alternative, lost, out))
            return -1;
    }
    if (!condition.alternatives.empty())
        out.append(")");
    return 0;
}

int SyslogSQLCondListStrGen(const std::list<_SYSLOG_SQL_COND_tag> &conditions, std::string &out,
                            LostValue lost) {
    const char *separator = "";
    std::string text;
    for (const _SYSLOG_SQL_COND_tag &condition : conditions) {
        out.append(separator);
        if (SyslogSQLCondStrGen(condition, text, lost) != 0)
            return -1;
        out.append(text);
        separator = " AND ";
    }
    return 0;
}

} // namespace kelo
