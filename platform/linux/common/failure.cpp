#include "common/failure.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>

#include "keloplatform/errors.h"
#include "keloplatform/failure_kind.h"

namespace {

thread_local char lastLine[4096] = "";
thread_local KELOFAILURE lastFailure;

} // namespace

namespace kelo::platform {

void ClearFailure() {
    lastLine[0] = '\0';
}

void ReportFailure(const char *format, ...) {
    va_list arguments;
    va_start(arguments, format);
    std::vsnprintf(lastLine, sizeof lastLine, format, arguments);
    va_end(arguments);
    syslog(LOG_ERR, "%s", lastLine);
}

int Fail(KELOFAILUREKIND kind, const char *function, std::string_view path, std::string_view text) {
    KELOFailureSet(lastFailure, kind, path, function, text);
    return -1;
}

int FailWithErrno(const char *function, std::string_view path, int error) {
    KELOFailureSetErrno(lastFailure, error, path, function);
    return -1;
}

int FailStatement(sqlite3 *db, std::string_view tried) {
    const char *path = sqlite3_db_filename(db, "main");
    KELOFailureSetSqlite(lastFailure, db, path != nullptr ? path : "", tried);
    return -1;
}

} // namespace kelo::platform

const char *KELOErrorGet() {
    return lastLine;
}

const KELOFAILURE *KELOFailureGet() {
    return &lastFailure;
}

void KELOFailureClear() {
    KELOFailureSet(lastFailure, KELO_FAILURE_NONE, "", "", "");
    --lastFailure.count;
}
