#pragma once

// The record, the vocabulary that names its parts, and the conversion of a database row to it.
//
//     _SYSLOG_LOG_DATA_tag log;
//     if (DBRecToLogInfo("logs", result, row, &log, false) == 0)
//         printf("%s %s\n", g_MappingSyslogPrior[log.prio], log.msg.c_str());
//
// Threads: everything here is stateless and may be used from any thread, but a result by one at a time.

#include <cstdint>
#include <string>

#include "kelosyslog/export.h"

struct DBResult_tag;

// Syslog severity (RFC 5424, section 6.2.1).
enum _SYSLOG_DB_PRIORITY_tag : int32_t {
    SYSLOG_PRIO_EMERG = 0,
    SYSLOG_PRIO_ALERT = 1,
    SYSLOG_PRIO_CRIT = 2,
    SYSLOG_PRIO_ERR = 3,
    SYSLOG_PRIO_WARNING = 4,
    SYSLOG_PRIO_NOTICE = 5,
    SYSLOG_PRIO_INFO = 6,
    SYSLOG_PRIO_DEBUG = 7,
};

// A column of a log table. `LogAttriStrGet` gives its name.
enum _SYSLOG_DB_ATTRI_tag : int32_t {
    SYSLOG_ATTRI_ID = 0,
    SYSLOG_ATTRI_HOST = 1,
    SYSLOG_ATTRI_IP = 2,
    SYSLOG_ATTRI_FAC = 3,
    SYSLOG_ATTRI_PRIO = 4,
    SYSLOG_ATTRI_LLEVEL = 5,
    SYSLOG_ATTRI_TAG = 6,
    SYSLOG_ATTRI_UTCSEC = 7,
    SYSLOG_ATTRI_TZOFFSET = 8,
    SYSLOG_ATTRI_LDATE = 9,
    SYSLOG_ATTRI_LTIME = 10,
    SYSLOG_ATTRI_PROG = 11,
    SYSLOG_ATTRI_MSG = 12,
    SYSLOG_ATTRI_LUSER = 13,
    SYSLOG_ATTRI_EVENT = 14,
    SYSLOG_ATTRI_ISDIR = 15,
    SYSLOG_ATTRI_FNAME = 16,
    SYSLOG_ATTRI_FSIZE = 17,
    SYSLOG_ATTRI_XFERIP = 18, // column "ip" of the transfer log
    SYSLOG_ATTRI_NONE = 19,   // no attribute
};

// Comparison operator of a search condition; `g_MappingSyslogOP` holds the SQL texts.
enum _SYSLOG_SQL_OP_tag : int32_t {
    SYSLOG_OP_EQ = 0,
    SYSLOG_OP_NE = 1,
    SYSLOG_OP_LT = 2,
    SYSLOG_OP_LE = 3,
    SYSLOG_OP_GT = 4,
    SYSLOG_OP_GE = 5,
    SYSLOG_OP_LIKE = 6,
    SYSLOG_OP_NOT_LIKE = 7,
    SYSLOG_OP_GLOB = 8,
    SYSLOG_OP_NOT_GLOB = 9,
    SYSLOG_OP_RAW = 10, // the value is itself an SQL expression
};

// One record. Texts are UTF-8 as received; nothing is escaped.
struct _SYSLOG_LOG_DATA_tag {
    uint64_t id = 0;
    int64_t utcsec = 0; // seconds since the epoch
    int64_t extnum = 0; // second number of the ingest text; no column of a log table holds it
    _SYSLOG_DB_PRIORITY_tag prio = SYSLOG_PRIO_EMERG;
    std::string tag;
    std::string host;
    std::string ip;
    std::string fac;
    std::string tzoffset; // "+08:00"
    std::string ldate;    // "2020/01/02", in the sender's time zone
    std::string ltime;    // "10:11:12"
    std::string prog;
    std::string msg;
    std::string luser;
    std::string event; // event of a transfer log; message of a general or connection log
    std::string xferip;
    std::string fname;
    uint64_t isdir = 0;
    std::string fsize;
};

// One kind of transfer log.
struct _SYSLOG_XFERLOG_INFO_tag {
    int32_t type;
    const char *name;
    const char *dbPath;
    int32_t number; // kept for the package's other programs
    const char *logName;
};

// Severity words, indexed by _SYSLOG_DB_PRIORITY_tag.
KELOSYSLOG_API extern const char *const g_MappingSyslogPrior[8];
// SQL operators, indexed by _SYSLOG_SQL_OP_tag; the last slot is null.
KELOSYSLOG_API extern const char *const g_MappingSyslogOP[11];
// The transfer logs; the last row is all zeros. The count includes it.
KELOSYSLOG_API extern const _SYSLOG_XFERLOG_INFO_tag g_xferlog_info[7];
KELOSYSLOG_API extern const int32_t g_xferlog_info_count;

// Column name of an attribute, 0 to 18; "" for any other. The text is constant.
KELOSYSLOG_API const char *LogAttriStrGet(_SYSLOG_DB_ATTRI_tag attr);

// The first attribute whose column has exactly this name, else SYSLOG_ATTRI_NONE.
KELOSYSLOG_API _SYSLOG_DB_ATTRI_tag LogAttriType(std::string name);

// Severity of an exact severity word; null and unknown words give SYSLOG_PRIO_DEBUG.
KELOSYSLOG_API _SYSLOG_DB_PRIORITY_tag PriorStrToType(const char *word);

// Severity word of a severity, 0 to 7; "" for any other.
KELOSYSLOG_API std::string PriorTypeToStr(_SYSLOG_DB_PRIORITY_tag prio);

// The text after the first colon of `text` (including a blank after it), or all of it without a colon.
KELOSYSLOG_API std::string TrimUserName(const std::string &text);

// Path of the database of the transfer log with this type name ("smbxfer"), "" when there is none. The text
// is constant.
KELOSYSLOG_API const char *XferlogDBPathGet(const char *name);

// Fills `log` from one row of a table: "logs", "general_log", "connection_log" or "transfer_log".
//
// `row` is a handle that KELODBFetchRow gave for `result`. Fields that the table does not have keep their
// values; a missing column and a NULL are read as the empty text, and a number is read from the leading
// digits of its text. With `trimUser` the message of a row of "logs" loses its user name (TrimUserName).
//
// Returns 0, or -1 with `log` untouched: another table, or a null pointer.
KELOSYSLOG_API int DBRecToLogInfo(const std::string &table, DBResult_tag *result, uint32_t row,
                                  _SYSLOG_LOG_DATA_tag *log, bool trimUser);

// The conversions behind DBRecToLogInfo: table "logs"; "general_log" and "connection_log" (whose message goes
// into `event`); "transfer_log". Each returns 0, or -1 when `result` or `log` is null.
KELOSYSLOG_API int DBRecToAllLogInfo(DBResult_tag *result, uint32_t row, _SYSLOG_LOG_DATA_tag *log,
                                     bool trimUser);
KELOSYSLOG_API int DBRecToSysLogInfo(DBResult_tag *result, uint32_t row, _SYSLOG_LOG_DATA_tag *log);
KELOSYSLOG_API int DBRecToXferLogInfo(DBResult_tag *result, uint32_t row, _SYSLOG_LOG_DATA_tag *log);
