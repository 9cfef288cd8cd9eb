#pragma once

#include <cerrno>
#include <string_view>

#include "keloplatform/failure.h"

struct sqlite3;

namespace kelo::platform {

// Clears the calling thread's last failure. The functions that KELOErrorGet describes call it first.
void ClearFailure();

// Writes a line to the system log (LOG_ERR; `format` as for syslog(3), "%m" included) and keeps it for
// KELOErrorGet. A line is cut to 4 KiB. Allocates nothing.
[[gnu::format(printf, 1, 2)]] void ReportFailure(const char *format, ...);

// Make what failed the calling thread's last failure, for KELOFailureGet. They allocate nothing and keep
// errno. `function` is the public function that fails. Each returns -1.
int Fail(KELOFAILUREKIND kind, const char *function, std::string_view path, std::string_view text);
int FailWithErrno(const char *function, std::string_view path, int error);
// With the error of a connection, which `tried` has caused.
int FailStatement(sqlite3 *db, std::string_view tried);

// Passes the result of a function on that says by it whether it failed, and by errno why: below 0, null or
// false. A failure becomes the thread's last one; a null `path` is none.
inline bool HasFailed(int result) {
    return result < 0;
}
inline bool HasFailed(bool result) {
    return !result;
}
inline bool HasFailed(const void *result) {
    return result == nullptr;
}
template <typename Result>
Result Recorded(const char *function, const char *path, Result result) {
    if (HasFailed(result))
        FailWithErrno(function, path != nullptr ? path : "", errno);
    return result;
}

} // namespace kelo::platform
