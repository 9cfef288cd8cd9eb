#include "support/platform_calls.h"

#include <dlfcn.h>

#include "keloplatform/kelodb.h"

namespace kelo::test {
namespace {

struct State {
    std::vector<PlatformCall> recorded;
    int count = 0;
    int failFirst = 0; // counted like `count`; 0 for never
    int failTimes = 0;
    bool hasFailed = false;
    int openConnections = 0;
    int openResults = 0;
};
State state;

// Records a call and tells whether it has to fail.
bool MustFail(PlatformCall call) {
    state.recorded.push_back(std::move(call));
    ++state.count;
    const bool fails = state.failFirst > 0 && state.count >= state.failFirst &&
                       state.count - state.failFirst < state.failTimes;
    state.hasFailed = state.hasFailed || fails;
    return fails;
}

std::string Text(const char *text) {
    return text != nullptr ? text : "";
}

// The platform library's own function behind one of ours.
template <typename Function>
Function *Real(Function *, const char *name) {
    return reinterpret_cast<Function *>(dlsym(RTLD_NEXT, name));
}

int CountResult(int status, DBResult_tag **result) {
    if (status >= 0 && result != nullptr && *result != nullptr)
        ++state.openResults;
    return status;
}

} // namespace

void PlatformCalls::Reset() {
    state.recorded.clear();
    state.count = 0;
    state.failFirst = 0;
    state.hasFailed = false;
}
const std::vector<PlatformCall> &PlatformCalls::Recorded() {
    return state.recorded;
}
int PlatformCalls::Count() {
    return state.count;
}
bool PlatformCalls::HasFailed() {
    return state.hasFailed;
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
    state.hasFailed = false;
}

bool PlatformCalls::MustFail(const char *function, const char *text) {
    return kelo::test::MustFail({function, Text(text)});
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

#define KELO_REAL(function) Real(function, #function)

extern "C" {

DBConnect_tag *KELODBConnect(const char *host, const char *user, const char *password, const char *path) {
    if (MustFail({"KELODBConnect", Text(path)}))
        return nullptr;
    DBConnect_tag *connection = KELO_REAL(KELODBConnect)(host, user, password, path);
    if (connection != nullptr)
        ++state.openConnections;
    return connection;
}

int KELODBClose(DBConnect_tag *connection) {
    if (connection != nullptr)
        --state.openConnections;
    return KELO_REAL(KELODBClose)(connection);
}

int KELODBExecute(DBConnect_tag *connection, const char *sql, DBResult_tag **result) {
    if (MustFail({"KELODBExecute", Text(sql)}))
        return -1;
    return CountResult(KELO_REAL(KELODBExecute)(connection, sql, result), result);
}

int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit, unsigned int offset,
                      DBResult_tag **result) {
    if (MustFail({"KELODBSelectLimit", Text(sql), limit, offset}))
        return -1;
    return CountResult(KELO_REAL(KELODBSelectLimit)(connection, sql, limit, offset, result), result);
}

int KELODBFetchRow(DBResult_tag *result, unsigned int *row) {
    if (MustFail({"KELODBFetchRow", ""}))
        return -1;
    return KELO_REAL(KELODBFetchRow)(result, row);
}

void KELODBFreeResult(DBResult_tag *result) {
    if (result != nullptr)
        --state.openResults;
    KELO_REAL(KELODBFreeResult)(result);
}

int KELODBEscapeStringEX(DBConnect_tag *connection, char *out, size_t outSize, const char *in, size_t inLen) {
    if (MustFail({"KELODBEscapeStringEX", std::string(in, inLen)}))
        return -1;
    return KELO_REAL(KELODBEscapeStringEX)(connection, out, outSize, in, inLen);
}

int KELODBEscapeStringEX2(DBConnect_tag *connection, char *out, size_t outSize, const char *in,
                          size_t inLen) {
    if (MustFail({"KELODBEscapeStringEX2", std::string(in, inLen)}))
        return -1;
    return KELO_REAL(KELODBEscapeStringEX2)(connection, out, outSize, in, inLen);
}

int KELODBEscapeBackslashEX2(DBConnect_tag *connection, char *out, size_t outSize, const char *in) {
    if (MustFail({"KELODBEscapeBackslashEX2", Text(in)}))
        return -1;
    return KELO_REAL(KELODBEscapeBackslashEX2)(connection, out, outSize, in);
}

} // extern "C"
