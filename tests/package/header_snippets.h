#pragma once

// What the examples in the headers take for granted: the reader's own variables and functions.

#include <cstdio>

#include "kelosyslog/accounting.h"
#include "kelosyslog/cmdparser.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/dbutil.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logger.h"
#include "kelosyslog/logparser.h"
#include "kelosyslog/notification.h"
#include "kelosyslog/records.h"
#include "kelosyslog/root.h"
#include "kelosyslog/utils.h"

inline AccountingManager accounting;
inline LogParser parser;
inline std::string text;
inline FILE *input = nullptr;
inline DBResult_tag *result = nullptr;
inline uint32_t row = 0;
namespace reader {
inline const _SYSLOG_LOG_DATA_tag log;
}
using reader::log;
int PrintLog(_SYSLOG_LOG_DATA_tag &log, void *);
bool Receive(std::string &host);
void Store(const _SYSLOG_LOG_DATA_tag &log);
