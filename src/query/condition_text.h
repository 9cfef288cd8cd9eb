#pragma once

#include <list>
#include <string>

#include "kelosyslog/dbutil.h"

namespace kelo {

// What becomes of a condition whose value could not be escaped. As the empty text it may select other rows
// than were meant.
enum class LostValue { IsEmpty, IsFailure };

// Appends the body of a WHERE clause for `conditions`, ANDed, to `out`; nothing for an empty list. Returns 0,
// or -1 when a condition could not be rendered, with what came before it left in `out`: its value holds a NUL
// byte, which SQLite takes for the end, or it was lost and `lost` says that this is a failure.
int SyslogSQLCondListStrGen(const std::list<_SYSLOG_SQL_COND_tag> &conditions, std::string &out,
                            LostValue lost = LostValue::IsEmpty);

// Replaces `out` by one condition in parentheses, its alternatives ORed. Returns as the list does.
//
// An operator or attribute that has no text gives SQL that fails as a syntax error, never one with another
// meaning.
int SyslogSQLCondStrGen(const _SYSLOG_SQL_COND_tag &condition, std::string &out,
                        LostValue lost = LostValue::IsEmpty);

// The value of a condition, escaped for the place between single quotes in SQL and for the condition's
// operator. "" for null, and when an escape function fails or memory runs out.
std::string SyslogSQLCondValueEscape(const _SYSLOG_SQL_COND_tag *condition);

// Whether a clause body matches every row, so that a statement with it can take a shortcut. Only the empty
// body and the one exact text of a match-all keyword do.
bool IsMatchAll(const std::string &body);

// The column of an attribute; for an attribute out of range a text that fails in any SQL.
const char *ColumnText(_SYSLOG_DB_ATTRI_tag attr);

} // namespace kelo
