#pragma once

// Searching, counting and deleting the records of a database.
//
//     std::list<_SYSLOG_SQL_COND_tag> conditions;
//     LogSearchCondListGen("nas,backup", "err", "", "", "disk*full", "2020/01/01", "2020/01/31", conditions);
//     _SYSLOG_SQL_LIMIT_tag page{50, 0};
//     _SYSLOG_SQL_ORDER_tag newestFirst{0, SYSLOG_ATTRI_ID};
//     SyslogDBSelect("/var/log/logs.db", conditions, &page, &newestFirst, PrintLog, nullptr, false);
//
// Threads: every function may be called from any thread, also for the same database. Reasons of failures are
// in failure.h; for searches on a kept connection see dbreader.h.
//
// Every function takes the absolute path of an existing database, opens a connection of its own, runs one
// statement and closes the connection before it returns. (SyslogDBExtkeyMapGet and SyslogDBExtkeyLookupByName
// ask for the generation first: two statements on two connections.) None throws on a database error; when
// memory runs out outside the database layer they throw std::bad_alloc, with everything closed and nothing
// deleted. A database is never created.

#include <cstdint>
#include <list>
#include <map>
#include <string>

#include "kelosyslog/export.h"
#include "kelosyslog/records.h"

// One comparison of a column with a value, with further comparisons that are ORed with it. A list of
// conditions is ANDed.
//
// The value is the operand as the user gave it; the library escapes it. For LIKE and NOT LIKE, '*' and '?'
// are the wildcards and '%' and '_' are literal; for GLOB, '[' and ']' are literal. A value of SYSLOG_OP_RAW
// is an SQL expression and goes into the statement unchanged: the caller is responsible for it. The
// alternatives of alternatives are ignored. With a NUL byte in a value, select, count and delete return -1
// before anything runs.
struct _SYSLOG_SQL_COND_tag {
    _SYSLOG_DB_ATTRI_tag attr = SYSLOG_ATTRI_ID;
    _SYSLOG_SQL_OP_tag op = SYSLOG_OP_EQ;
    std::string value;
    std::list<_SYSLOG_SQL_COND_tag> alternatives;
};

// A page: `limit` rows after skipping `offset`. A limit of 0 means all rows.
struct _SYSLOG_SQL_LIMIT_tag {
    uint64_t limit = 0;
    uint64_t offset = 0;
};

// The sort order: non-zero `ascending` for ascending, 0 for descending.
struct _SYSLOG_SQL_ORDER_tag {
    int32_t ascending = 0;
    _SYSLOG_DB_ATTRI_tag attr = SYSLOG_ATTRI_ID;
};

// Receives one row. `log` is reused for the next row. Returning non-zero ends the scan.
using SyslogDBRowCallback = int (*)(_SYSLOG_LOG_DATA_tag &log, void *context);

// Passes the rows of `table` that meet all `conditions` to `callback` (which may be null), one by one.
//
// A null `limit` means all rows, a null `order` no order. Without a filter, a page is taken by row id: the
// rows whose id lies in (largest - offset - limit, largest - offset]; after deletions such a page may have
// fewer rows. The order sorts only within such a page: "oldest first" gives the newest page turned round. For
// the oldest rows add a condition that all meet, such as `id >= 0`, which makes it a filtered page.
// `trimUser` removes the user name from the messages of table "logs".
//
// Returns 0, also when the callback ended the scan, or -1 with a message in the system log: a path that is
// not absolute, a database that cannot be opened, a statement that failed.
KELOSYSLOG_API int SyslogDBSelectByTable(const std::string &dbPath, const std::string &table,
                                         const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                                         _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order,
                                         SyslogDBRowCallback callback, void *context, bool trimUser);

// SyslogDBSelectByTable on table "logs".
KELOSYSLOG_API int SyslogDBSelect(const std::string &dbPath,
                                  const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                                  _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order,
                                  SyslogDBRowCallback callback, void *context, bool trimUser);

// Counts the rows of `table` that meet all `conditions`. Without a filter the count is the largest row id,
// which is instant but counts deleted rows too. `limit` and `order` go into the counting statement itself.
//
// Returns the count, narrowed to int; -1 for a failure (only a bad path is reported in the system log),
// also when the statement gave no row (a `limit` that skips it); -2 when it gave several rows.
KELOSYSLOG_API int SyslogDBSelectCountByTable(const std::string &dbPath, const std::string &table,
                                              const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                                              _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order);

// SyslogDBSelectCountByTable on table "logs".
KELOSYSLOG_API int SyslogDBSelectCount(const std::string &dbPath,
                                       const std::list<_SYSLOG_SQL_COND_tag> &conditions,
                                       _SYSLOG_SQL_LIMIT_tag *limit, _SYSLOG_SQL_ORDER_tag *order);

// Deletes the rows of table "logs" that meet all `conditions`; all rows when there are none. Returns 0, or
// -1 with nothing deleted: only a bad path is reported in the system log. Nothing runs if a condition cannot
// be rendered exactly.
KELOSYSLOG_API int SyslogDBDelete(const std::string &dbPath,
                                  const std::list<_SYSLOG_SQL_COND_tag> &conditions);

// Appends the conditions of a filter form to `conditions`.
//
// `host`, `level`, `facility` and `program` are comma-separated alternatives; "" and "any" mean all.
// `keyword` is a search expression (GenSQLRegexp) on the message, "" for none. The dates are texts as in
// column "ldate" ("2020/01/02"), both inclusive; "" and "0" mean open.
KELOSYSLOG_API void LogSearchCondListGen(const std::string &host, const std::string &level,
                                         const std::string &facility, const std::string &program,
                                         const std::string &keyword, const std::string &dateFrom,
                                         const std::string &dateTo,
                                         std::list<_SYSLOG_SQL_COND_tag> &conditions);

// Appends the condition that `conditions` become, ANDed, to `clause`, for a WHERE of one's own; nothing when
// there are none. The statements of the library have exactly this text.
//
//     std::string clause;
//     LogSearchClauseGet({{SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "nas", {}}}, clause); // (host = 'nas')
//
// Returns 0, or -1 with an unchanged clause when a condition cannot be rendered exactly: its value holds a
// NUL byte, or memory ran out.
KELOSYSLOG_API int LogSearchClauseGet(const std::list<_SYSLOG_SQL_COND_tag> &conditions, std::string &clause);

// Generation of a database's format: 1 when it has the readable table "db_info", else 2. A bad path (reported
// in the system log) and a failed connection count as 1.
KELOSYSLOG_API int SyslogDBVersionGet(const std::string &dbPath);

// The statistics of an accounting database. All of these answer a failure like an empty table, with 0 or an
// empty map; only a bad path is reported in the system log.

// One sample of received records.
struct SYSLOG_LOG_EPS {
    int64_t stamp = 0;                      // seconds since the epoch
    int64_t eps = 0;                        // records since the sample before
    std::map<std::string, int32_t> devices; // the same by sending device
};

// Sum of the counts of all devices.
KELOSYSLOG_API uint64_t SyslogDBHistTotalGet(const std::string &dbPath);

// Count of one device. `device` goes into the statement unchanged, between single quotes: the caller doubles
// the quotes in it.
KELOSYSLOG_API uint64_t SyslogDBHistGetSingle(const std::string &dbPath, std::string device);

// Counts by device, of the `top` devices with the highest counts or, for 0, of all. Of two rows of the same
// device the first is used.
KELOSYSLOG_API std::map<std::string, uint64_t> SyslogDBHistGet(const std::string &dbPath, int top);

// The samples with stamps in [from, to], seconds since the epoch, by stamp. A sample's total sums all its
// rows; of two rows of one device in a sample, `devices` has the first. The bounds should be 0 or more: a
// negative one is above every stamp.
KELOSYSLOG_API std::map<int, SYSLOG_LOG_EPS> SyslogDBEpsGet(const std::string &dbPath, int from, int to);

// Appends the distinct values of a column of table "logs", named as LogAttriType knows it, to `values` in
// ascending order; a NULL is read as the empty text. A null `limit` means all values.
//
// Returns 0 or -1; a bad path and an unknown name are reported in the system log.
KELOSYSLOG_API int SyslogDBAttriValueGet(const std::string &dbPath, const std::string &name,
                                         _SYSLOG_SQL_LIMIT_tag *limit, std::list<std::string> &values);

// A kind of name that databases of generation 1 store in a separate table, by numeric key.
enum _SYSLOG_EXTKEY_TB_TYPE_tag : int32_t {
    SYSLOG_EXTKEY_HOST = 0,
    SYSLOG_EXTKEY_PROG = 1,
    SYSLOG_EXTKEY_TAG = 2,
    SYSLOG_EXTKEY_FAC = 3,
};

// Fills `names` with the names of one kind by their keys; keys that are already in it keep their names. A
// database of generation 2 has no keys: its distinct names are numbered from 0 in the order of the result.
//
// Returns 0 or -1; a bad path is reported in the system log.
KELOSYSLOG_API int SyslogDBExtkeyMapGet(const std::string &dbPath, _SYSLOG_EXTKEY_TB_TYPE_tag type,
                                        std::map<uint64_t, std::string> &names);

// The lowest key of exactly this name; 0 when there is none, and on a failure, which is reported in the
// system log. (0 is also the key of the first name of a database of generation 2.)
KELOSYSLOG_API uint64_t SyslogDBExtkeyLookupByName(const std::string &dbPath, _SYSLOG_EXTKEY_TB_TYPE_tag type,
                                                   std::string name);
