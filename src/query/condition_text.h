#pragma once

#include <list>
#include <string>

#include "kelosyslog/dbutil.h"

namespace kelo {

// Appends the body of a WHERE clause for `conditions`, ANDed, to `out`; nothing for an empty list. Returns 0,
// or -1 when a condition could not be rendered; the conditions before it are then in `out`.
int SyslogSQLCondListStrGen(const std::list<_SYSLOG_SQL_COND_tag> &conditions, std::string &out);

// Replaces `out` by one condition in parentheses, its alternatives ORed. Returns 0.
//
// An operator or attribute that has no text gives SQL that fails as a syntax error, never one with another
// meaning.
int SyslogSQLCondStrGen(const _SYSLOG_SQL_COND_tag &condition, std::string &out);

// The value of a condition, escaped for the place between single quotes in SQL and for the condition's
// operator. "" for null, and when an escape function fails or memory runs out.
std::string SyslogSQLCondValueEscape(const _SYSLOG_SQL_COND_tag *condition);

// Whether a clause body matches every row, so that a statement with it can take a shortcut. Only the empty
// body and the one exact text of a match-all keyword do.
bool IsMatchAll(const std::string &body);

// The column of an attribute; for an attribute out of range a text that fails in any SQL.
const char *ColumnText(_SYSLOG_DB_ATTRI_tag attr);

} // namespace kelo
