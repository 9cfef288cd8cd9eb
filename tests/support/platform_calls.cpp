#include "support/platform_calls.h"

#include <dlfcn.h>

#include <cstring>
#include <mutex>

#include "keloplatform/kelodb.h"
#include "support/fault_pause.h"

namespace kelo::test {
namespace {

struct State {
    std::vector<PlatformCall> recorded;
    int count = 0;
    int failFirst = 0; // counted like `count`; 0 for never
    int failTimes = 0;
    std::string failedFunction;
    int openConnections = 0;
    int openResults = 0;
};
State state;
std::mutex stateMutex;

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

// Records a call and tells whether it has to fail.
bool MustFail(const char *function, const char *text, size_t length, unsigned int limit = 0,
              unsigned int offset = 0) {
    if (PlatformVisit::IsActive())
        return false;
    const FaultPause pause;
    const std::lock_guard lock(stateMutex);
    state.recorded.push_back(
        {function, text != nullptr ? std::string(text, length) : std::string(), limit, offset});
    ++state.count;
    const bool fails = state.failFirst > 0 && state.count >= state.failFirst &&
                       state.count - state.failFirst < state.failTimes;
    if (fails && state.failedFunction.empty())
        state.failedFunction = function;
    return fails;
}

bool MustFail(const char *function, const char *text) {
    return MustFail(function, text, text != nullptr ? std::strlen(text) : 0);
}

// Calls the platform library's own function behind one of ours.
template <auto *Function, typename... Arguments>
auto CallReal(const char *name, Arguments... arguments) {
    static const auto real = [name] {
        const FaultPause pause;
        return reinterpret_cast<decltype(Function)>(dlsym(RTLD_NEXT, name));
    }();
    const PlatformVisit visit;
    return real(arguments...);
}

void Count(int State::*handles, int change) {
    if (PlatformVisit::IsActive())
        return;
    const std::lock_guard lock(stateMutex);
    state.*handles += change;
}

int CountResult(int status, DBResult_tag **result) {
    if (status >= 0 && result != nullptr && *result != nullptr)
        Count(&State::openResults, 1);
    return status;
}

} // namespace

void PlatformCalls::Reset() {
    state.recorded.clear();
    state.count = 0;
    state.failFirst = 0;
    state.failedFunction.clear();
}
const std::vector<PlatformCall> &PlatformCalls::Recorded() {
    return state.recorded;
}
int PlatformCalls::Count() {
    return state.count;
}
bool PlatformCalls::HasFailed() {
    return !state.failedFunction.empty();
}
std::string PlatformCalls::FailedFunction() {
    return state.failedFunction;
}
int PlatformCalls::OpenConnections() {
    return state.openConnections;
}
int PlatformCalls::OpenResults() {
    return state.openResults;
}

void PlatformCalls::FailFrom(int first, int times) {
    state.failFirst = state.count + first;
    state.failTimes = times;
    state.failedFunction.clear();
}

bool PlatformCalls::MustFail(const char *function, const char *text) {
    return kelo::test::MustFail(function, text);
}

std::vector<std::string> PlatformCalls::Statements() {
    std::vector<std::string> statements;
    for (const PlatformCall &call : state.recorded) {
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
    if (MustFail("KELODBConnect", path))
        return nullptr;
    DBConnect_tag *connection = KELO_CALL_REAL(KELODBConnect, host, user, password, path);
    if (connection != nullptr)
        Count(&State::openConnections, 1);
    return connection;
}

int KELODBClose(DBConnect_tag *connection) {
    if (connection != nullptr)
        Count(&State::openConnections, -1);
    return KELO_CALL_REAL(KELODBClose, connection);
}

int KELODBExecute(DBConnect_tag *connection, const char *sql, DBResult_tag **result) {
    if (MustFail("KELODBExecute", sql))
        return -1;
    return CountResult(KELO_CALL_REAL(KELODBExecute, connection, sql, result), result);
}

int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit, unsigned int offset,
                      DBResult_tag **result) {
    if (MustFail("KELODBSelectLimit", sql, sql != nullptr ? std::strlen(sql) : 0, limit, offset))
        return -1;
    return CountResult(KELO_CALL_REAL(KELODBSelectLimit, connection, sql, limit, offset, result), result);
}

int KELODBFetchRow(DBResult_tag *result, unsigned int *row) {
    if (MustFail("KELODBFetchRow", nullptr))
        return -1;
    return KELO_CALL_REAL(KELODBFetchRow, result, row);
}

void KELODBFreeResult(DBResult_tag *result) {
    if (result != nullptr)
        Count(&State::openResults, -1);
    KELO_CALL_REAL(KELODBFreeResult, result);
}

int KELODBEscapeStringEX(DBConnect_tag *connection, char *out, size_t outSize, const char *in, size_t inLen) {
    if (MustFail("KELODBEscapeStringEX", in, inLen))
        return -1;
    return KELO_CALL_REAL(KELODBEscapeStringEX, connection, out, outSize, in, inLen);
}

int KELODBEscapeStringEX2(DBConnect_tag *connection, char *out, size_t outSize, const char *in,
                          size_t inLen) {
    if (MustFail("KELODBEscapeStringEX2", in, inLen))
        return -1;
    return KELO_CALL_REAL(KELODBEscapeStringEX2, connection, out, outSize, in, inLen);
}

int KELODBEscapeBackslashEX2(DBConnect_tag *connection, char *out, size_t outSize, const char *in) {
    if (MustFail("KELODBEscapeBackslashEX2", in))
        return -1;
    return KELO_CALL_REAL(KELODBEscapeBackslashEX2, connection, out, outSize, in);
}

} // extern "C"
