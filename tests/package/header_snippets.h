#pragma once

// What the examples in the headers take for granted: the reader's own variables and functions.

inline AccountingManager accounting;
inline LogParser parser;
inline std::string text;
inline FILE *input = nullptr;
inline DBResult_tag *result = nullptr;
inline uint32_t row = 0;
inline std::list<_SYSLOG_SQL_COND_tag> conditions;
inline _SYSLOG_SQL_LIMIT_tag page{50, 0};
namespace reader {
inline const _SYSLOG_LOG_DATA_tag log;
}
using reader::log;
int PrintLog(_SYSLOG_LOG_DATA_tag &log, void *);
bool Receive(std::string &host);
void Store(const _SYSLOG_LOG_DATA_tag &log);
void TryAgainLater();
