#include "kelosyslog/debuger.h"
#include "kelosyslog/logparser.h"
#include "kelosyslog/utils.h"

// No text is composed while the debug channel drops it.

void LogParser::LogDump() const {
    if (Debuger::ThresholdGet() < 2)
        return;
    Debuger::MSG(2, "Log count: " + ullNumberToString(logList_.size()));
    for (const _SYSLOG_LOG_DATA_tag &log : logList_)
        Debuger::MSG(2, "Log countent: " + log.msg);
}

void LogParser::PartialLogDump() const {
    if (Debuger::ThresholdGet() < 2)
        return;
    Debuger::MSG(2, "Partial log count: " + ullNumberToString(partialLogList_.size()));
    for (const _SYSLOG_LOG_DATA_tag &log : partialLogList_)
        Debuger::MSG(2, "Log countent: " + log.host + " " + log.ip + " " + log.ldate + " " + log.ltime + " " +
                            log.prog + " " + log.msg);
}
