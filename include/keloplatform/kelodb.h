#pragma once

// The appliance's database layer: connections and statements over SQLite.
//
// Threads: a connection and its results are used by one thread at a time. Nothing here throws: a failure is a
// null or negative result, and the connection has the cause (KELODBErrorGet, sqlite3_errcode() on
// KELODBInternalDBHdlGet, and failure.h). Nothing writes to the system log but a search that removes a
// damaged skip index (skip_index.h).

#include <cstddef>

#include "keloplatform/export.h"

struct sqlite3;

// A connection to one database file.
struct DBConnect_tag;
// The complete result of one statement, independent of the connection's later work.
struct DBResult_tag;

extern "C" {

// Opens the existing database file at `path` for reading and writing, or only for reading if the caller may
// not write it. The first three arguments (host, user, password on other systems) are ignored and called with
// 0.
//
// The file is never created, and `path` is taken literally (no "file:" URI). Statements wait for another
// writer with a time-out. SQL reached through the connection can neither load extensions nor attach other
// files.
//
// Returns a connection that the caller closes with KELODBClose, or null: no path (errno EINVAL), no such file
// (ENOENT), no permission (EACCES), a folder (EISDIR), out of memory (ENOMEM). A file that is not a database
// is detected only by the first statement.
KELOPLATFORM_API DBConnect_tag *KELODBConnect(const char *, const char *, const char *, const char *path);

// Closes the connection; null is accepted. Results stay valid until they are freed themselves. Returns 0, or
// -1 when SQLite refused to close.
KELOPLATFORM_API int KELODBClose(DBConnect_tag *connection);

// Runs exactly one statement to its end. A text with a second statement fails before anything runs; a text
// without any statement succeeds and does nothing.
//
// `result`, when not null, receives the complete result, to be freed with KELODBFreeResult, or null for a
// statement that has no columns and on failure. Returns 0, or -1 after which the connection has the cause.
KELOPLATFORM_API int KELODBExecute(DBConnect_tag *connection, const char *sql, DBResult_tag **result);

// As KELODBExecute for one SELECT without a LIMIT clause of its own, of whose rows it skips `offset` and then
// takes `limit` at the most; a limit of 0 means all. The bounds reach SQLite, so a sorted page does not sort
// the table.
KELOPLATFORM_API int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit,
                                       unsigned int offset, DBResult_tag **result);

// Number of rows in the result; 0 for null.
KELOPLATFORM_API int KELODBNumRows(DBResult_tag *result);

// Advances to the next row (the first at the first call) and stores its handle in `row`. Returns 0, or below
// 0 when there is no further row or an argument is null.
KELOPLATFORM_API int KELODBFetchRow(DBResult_tag *result, unsigned int *row);

// The text of a column of a row whose handle KELODBFetchRow gave. The name is compared without regard to the
// case of ASCII letters, as in SQL; of two columns with the same name the first is used. The text is
// NUL-terminated and belongs to the result. Null when the result has no such row or column, or the value is
// NULL.
KELOPLATFORM_API const char *KELODBFetchField(DBResult_tag *result, unsigned int row, const char *column);

// Frees a result; null is accepted.
KELOPLATFORM_API void KELODBFreeResult(DBResult_tag *result);

// Text of the connection's last error, valid until its next call. Never null, not even for a null connection.
KELOPLATFORM_API const char *KELODBErrorGet(DBConnect_tag *connection);

// The SQLite handle behind the connection (null for null). It stays the connection's own.
KELOPLATFORM_API sqlite3 *KELODBInternalDBHdlGet(DBConnect_tag *connection);

// Writes `inLen` bytes of `in` to `out` so that they can be put between single quotes in SQL: every single
// quote is doubled and nothing else is changed. `out` is NUL-terminated. The connection may be null.
//
// Returns the number of bytes written without the NUL, or -1: an argument is null, `outSize` is too small, or
// the text holds a NUL byte, which no SQL text can carry. 2 * inLen + 1 bytes always suffice.
KELOPLATFORM_API int KELODBEscapeStringEX(DBConnect_tag *connection, char *out, size_t outSize,
                                          const char *in, size_t inLen);

// The same as KELODBEscapeStringEX.
KELOPLATFORM_API int KELODBEscapeStringEX2(DBConnect_tag *connection, char *out, size_t outSize,
                                           const char *in, size_t inLen);

// Copies the C string `in` to `out` with a backslash before every '%', '_' and '\', for LIKE ... ESCAPE '\'.
// Results as for KELODBEscapeStringEX; 2 * strlen(in) + 1 bytes always suffice.
KELOPLATFORM_API int KELODBEscapeBackslashEX2(DBConnect_tag *connection, char *out, size_t outSize,
                                              const char *in);

} // extern "C"
