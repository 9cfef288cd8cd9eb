#include "support/platform_calls.h"

#include <mutex>

#include "keloplatform/kelodb.h"
#include "support/fault_pause.h"
#include "support/real_function.h"

namespace kelo::test {
namespace {

std::mutex callMutex;

// Lives while the real library works: what it calls of its own functions is no call into the platform.
class PlatformVisit {
public:
    PlatformVisit() { ++depth_; }
    ~PlatformVisit() { --depth_; }
    PlatformVisit(const PlatformVisit &) = delete;
    PlatformVisit &operator=(const PlatformVisit &) = delete;
    static bool IsActive() { return depth_ > 0; }

private:
    static inline thread_local int depth_ = 0;
};

// Calls the platform library's own function behind one of ours.
template <auto *Function, typename... Arguments>
auto CallReal(const char *name, Arguments... arguments) {
    static const auto real = Real<Function>(name);
    const PlatformVisit visit;
    return real(arguments...);
}

int CountedResult(int status, DBResult_tag **result) {
    if (status >= 0 && result != nullptr && *result != nullptr)
        PlatformCalls::CountResult(1);
    return status;
}

} // namespace

void PlatformCalls::Reset() {
    recorded_.clear();
    failFirst_ = 0;
    failedFunction_.clear();
}

void PlatformCalls::FailFrom(int first, int times) {
    failFirst_ = int64_t{Count()} + first;
    failTimes_ = times;
    failedFunction_.clear();
}

bool PlatformCalls::MustFail(const char *function, const char *text, unsigned int limit,
                             unsigned int offset) {
    if (PlatformVisit::IsActive())
        return false;
    const FaultPause pause;
    const std::lock_guard lock(callMutex);
    recorded_.push_back({function, text != nullptr ? text : "", limit, offset});
    const bool fails = failFirst_ > 0 && Count() >= failFirst_ && Count() - failFirst_ < failTimes_;
    if (fails && failedFunction_.empty())
        failedFunction_ = function;
    return fails;
}

void PlatformCalls::CountConnection(int change) {
    if (!PlatformVisit::IsActive())
        openConnections_ += change;
}

void PlatformCalls::CountResult(int change) {
    if (!PlatformVisit::IsActive())
        openResults_ += change;
}

std::vector<std::string> PlatformCalls::Statements() {
    std::vector<std::string> statements;
    for (const PlatformCall &call : recorded_) {
        if (call.function == "KELODBExecute" || call.function == "KELODBSelectLimit")
            statements.push_back(call.text);
    }
    return statements;
}

} // namespace kelo::test

using namespace kelo::test;

#define KELO_CALL_REAL(function, ...) CallReal<&function>(#function, __VA_ARGS__)

extern "C" {

DBConnect_tag *KELODBConnect(const char *host, const char *user, const char *password, const char *path) {
    if (PlatformCalls::MustFail("KELODBConnect", path))
        return nullptr;
    DBConnect_tag *connection = KELO_CALL_REAL(KELODBConnect, host, user, password, path);
    PlatformCalls::CountConnection(connection != nullptr ? 1 : 0);
    return connection;
}

int KELODBClose(DBConnect_tag *connection) {
    PlatformCalls::CountConnection(connection != nullptr ? -1 : 0);
    return KELO_CALL_REAL(KELODBClose, connection);
}

int KELODBExecute(DBConnect_tag *connection, const char *sql, DBResult_tag **result) {
    if (PlatformCalls::MustFail("KELODBExecute", sql))
        return -1;
    return CountedResult(KELO_CALL_REAL(KELODBExecute, connection, sql, result), result);
}

int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit, unsigned int offset,
                      DBResult_tag **result) {
    if (PlatformCalls::MustFail("KELODBSelectLimit", sql, limit, offset))
        return -1;
    return CountedResult(KELO_CALL_REAL(KELODBSelectLimit, connection, sql, limit, offset, result), result);
}

int KELODBFetchRow(DBResult_tag *result, unsigned int *row) {
    if (PlatformCalls::MustFail("KELODBFetchRow", nullptr))
        return -1;
    return KELO_CALL_REAL(KELODBFetchRow, result, row);
}

void KELODBFreeResult(DBResult_tag *result) {
    PlatformCalls::CountResult(result != nullptr ? -1 : 0);
    KELO_CALL_REAL(KELODBFreeResult, result);
}

int KELODBEscapeStringEX(DBConnect_tag *connection, char *out, size_t outSize, const char *in, size_t inLen) {
    if (PlatformCalls::MustFail("KELODBEscapeStringEX", in))
        return -1;
    return KELO_CALL_REAL(KELODBEscapeStringEX, connection, out, outSize, in, inLen);
}

int KELODBEscapeStringEX2(DBConnect_tag *connection, char *out, size_t outSize, const char *in,
                          size_t inLen) {
    if (PlatformCalls::MustFail("KELODBEscapeStringEX2", in))
        return -1;
    return KELO_CALL_REAL(KELODBEscapeStringEX2, connection, out, outSize, in, inLen);
}

int KELODBEscapeBackslashEX2(DBConnect_tag *connection, char *out, size_t outSize, const char *in) {
    if (PlatformCalls::MustFail("KELODBEscapeBackslashEX2", in))
        return -1;
    return KELO_CALL_REAL(KELODBEscapeBackslashEX2, connection, out, outSize, in);
}

} // extern "C"
