#pragma once

#include <tuple>

#include "kelosyslog/records.h"

// Everything that an entry of log text sets.
inline auto EntryFields(const _SYSLOG_LOG_DATA_tag &log) {
    return std::tie(log.fac, log.prio, log.ldate, log.ltime, log.utcsec, log.extnum, log.tzoffset, log.host,
                    log.ip, log.prog, log.tag, log.msg);
}

inline bool operator==(const _SYSLOG_LOG_DATA_tag &left, const _SYSLOG_LOG_DATA_tag &right) {
    return EntryFields(left) == EntryFields(right);
}
