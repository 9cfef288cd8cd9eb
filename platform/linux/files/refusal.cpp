#include "files/refusal.h"

#include <syslog.h>

#include <cerrno>

namespace kelo::platform {

void ReportRefusal(const std::string &path, size_t line, const std::string &reason) {
    const int savedErrno = errno;
    if (line > 0)
        syslog(LOG_WARNING, "%s:%zu: %s", path.c_str(), line, reason.c_str());
    else
        syslog(LOG_WARNING, "%s: %s", path.c_str(), reason.c_str());
    errno = savedErrno;
}

int FailWith(int cause) {
    errno = cause;
    return -1;
}

} // namespace kelo::platform
