#include "common/report.h"

#include <syslog.h>

namespace kelo {

void ReportError(const std::string &text) {
    syslog(LOG_ERR, "%s", text.c_str());
}

void ReportErrorAt(const char *source, int line, const std::string &text) {
    syslog(LOG_ERR, "%s:%d %s", source, line, text.c_str());
}

} // namespace kelo
