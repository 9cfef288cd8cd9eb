#include "common/failure.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>

#include "keloplatform/errors.h"

namespace {

thread_local char lastFailure[4096] = "";

} // namespace

namespace kelo::platform {

void ClearFailure() {
    lastFailure[0] = '\0';
}

void ReportFailure(const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(lastFailure, sizeof lastFailure, format, arguments);
    va_end(arguments);
    syslog(LOG_ERR, "%s", lastFailure);
}

} // namespace kelo::platform

const char *KELOErrorGet() {
    return lastFailure;
}
