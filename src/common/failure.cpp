#include "common/failure.h"

#include <cerrno>
#include <cstring>

#include "keloplatform/failure_kind.h"
#include "keloplatform/kelodb.h"

// A platform may lack it.
extern "C" [[gnu::weak]] const KELOFAILURE *KELOFailureGet();

namespace {

thread_local KELOFAILURE lastFailure;
thread_local unsigned int takenFromPlatform = 0; // the count of the last one that was taken over

} // namespace

namespace kelo {

int Fail(KELOFAILUREKIND kind, std::string_view path, std::string_view tried, std::string_view text) {
    KELOFailureSet(lastFailure, kind, path, tried, text);
    return -1;
}

int FailWithErrno(std::string_view path, std::string_view tried, int error) {
    KELOFailureSetErrno(lastFailure, error, path, tried);
    return -1;
}

int FailStatement(DBConnect_tag *connection, std::string_view path, std::string_view tried, int lastError) {
    sqlite3 *db = KELODBInternalDBHdlGet(connection);
    if (db == nullptr)
        return Fail(KELO_FAILURE_ARGUMENT, path, tried, "not connected");
    KELOFailureSetSqlite(lastFailure, db, path, tried);
    if ((lastFailure.sqliteCode & 0xFF) == SQLITE_IOERR && lastFailure.systemCode == 0 && lastError != 0) {
        lastFailure.systemCode = lastError;
        lastFailure.kind = KELOFailureKindOfSqlite(lastFailure.sqliteCode, lastFailure.text, lastError);
    }
    return -1;
}

int FailPlatform(std::string_view path, const char *function) {
    const int error = errno;
    const KELOFAILURE *told = KELOFailureGet != nullptr ? KELOFailureGet() : nullptr;
    if (told == nullptr || told->count == takenFromPlatform || std::strcmp(told->tried, function) != 0)
        return FailWithErrno(path, function, error);
    takenFromPlatform = told->count;
    KELOFailureSet(lastFailure, told->kind, path.empty() ? told->path : path, function, told->text);
    lastFailure.sqliteCode = told->sqliteCode;
    lastFailure.systemCode = told->systemCode;
    return -1;
}

FailureKeeper::~FailureKeeper() {
    lastFailure = failure_;
}

unsigned int PlatformFailureCount() {
    return KELOFailureGet != nullptr ? KELOFailureGet()->count : 0;
}

} // namespace kelo

const KELOFAILURE *SyslogFailureGet() {
    return &lastFailure;
}

void SyslogFailureClear() {
    KELOFailureSet(lastFailure, KELO_FAILURE_NONE, "", "", "");
    --lastFailure.count;
}
