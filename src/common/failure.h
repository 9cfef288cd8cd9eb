#pragma once

#include <string_view>

#include "kelosyslog/failure.h"

struct DBConnect_tag;

namespace kelo {

// Make what failed the calling thread's last failure, for SyslogFailureGet. They allocate nothing and keep
// errno. Each returns -1, the result of most functions that fail.
int Fail(KELOFAILUREKIND kind, std::string_view path, std::string_view tried, std::string_view text);
int FailWithErrno(std::string_view path, std::string_view tried, int error);
// With the error of a connection, which may be null, after `tried`, a statement. SQLite forgets the reason of
// a write that fails within a statement: `lastError` is then the errno after a call before which it was 0.
int FailStatement(DBConnect_tag *connection, std::string_view path, std::string_view tried,
                  int lastError = 0);
// After a call of a platform function that gives no reason but errno, which the caller has set to 0 before.
// Where the platform tells more than that (KELOFailureGet), it is taken over.
int FailPlatform(std::string_view path, const char *function);

// Puts the last failure of this moment back at the end of a scope, whatever else fails while work is taken
// back.
class FailureKeeper {
public:
    FailureKeeper() : failure_(*SyslogFailureGet()) {}
    ~FailureKeeper();
    FailureKeeper(const FailureKeeper &) = delete;
    FailureKeeper &operator=(const FailureKeeper &) = delete;

private:
    const KELOFAILURE failure_;
};

// Number of failures that the platform has told this thread of.
unsigned int PlatformFailureCount();

} // namespace kelo
