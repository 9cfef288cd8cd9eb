#include "support/platform_calls.h"

#include <mutex>

#include "keloplatform/kelodb.h"
#include "keloplatform/kelonotify.h"
#include "keloplatform/kelosystem.h"
#include "keloplatform/torvc.h"

namespace kelo::test {
namespace {

// In the real library: what it calls of its own functions is no call into the platform.
using PlatformVisit = Stay<struct Platform>;

std::mutex mutex;
std::map<const TORVSZHASH *, std::map<std::string, std::string>> hashes;

bool MustFail(const char *function, const char *text, unsigned int limit = 0, unsigned int offset = 0) {
    const FaultPause pause;
    return PlatformCalls::MustFail(function, text != nullptr ? text : "", limit, offset);
}

template <auto *Function, typename... Arguments>
auto CallReal(const char *name, const Arguments &...arguments) {
    const PlatformVisit visit;
    return Real<Function>(name)(arguments...);
}

template <typename Handle>
Handle *Opened(Handle *handle) {
    PlatformCalls::CountHandle(handle, 1);
    return handle;
}

int WithResult(int status, DBResult_tag **result) {
    if (status >= 0 && result != nullptr)
        Opened(*result);
    return status;
}

template <typename Handle>
Handle *Closing(Handle *handle) {
    PlatformCalls::CountHandle(handle, -1);
    return handle;
}

} // namespace

bool PlatformCalls::MustFail(const char *function, const std::string &text, unsigned int limit,
                             unsigned int offset) {
    if (PlatformVisit::IsActive())
        return false;
    const FaultPause pause;
    const std::lock_guard lock(mutex);
    recorded_.push_back({function, text, limit, offset});
    const bool fails = failing_.MustFail();
    if (fails && failedFunction_.empty())
        failedFunction_ = function;
    return fails;
}

void PlatformCalls::CountHandle(const void *handle, int change) {
    if (handle != nullptr && !PlatformVisit::IsActive())
        openHandles_ += change;
}

std::vector<std::string> PlatformCalls::Texts(const std::set<std::string> &functions) {
    std::vector<std::string> texts;
    for (const PlatformCall &call : recorded_) {
        if (functions.contains(call.function))
            texts.push_back(call.text);
    }
    return texts;
}

} // namespace kelo::test

using namespace kelo::test;

#define KELO_REAL(name, ...) CallReal<&name>(#name, __VA_ARGS__)
#define KELO_UNPACK(...) __VA_ARGS__
// A function that fails with `failure` when it must. `text` is recorded; `after` gets the real one's result.
#define KELO_DOUBLE(Type, name, parameters, arguments, text, failure, after)                                 \
    Type name parameters {                                                                                   \
        return MustFail(#name, text) ? (failure) : after(KELO_REAL(name, KELO_UNPACK arguments));            \
    }

bool KELOSystemdReload(const std::string &service) {
    if (MustFail("KELOSystemdReload", service.c_str()))
        return false;
    if (PlatformCalls::answers.onReload)
        PlatformCalls::answers.onReload();
    const auto answer = PlatformCalls::answers.reload;
    constexpr char kMangled[] = "_Z17KELOSystemdReloadRKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEE";
    return answer ? *answer : CallReal<&KELOSystemdReload>(kMangled, service);
}

extern "C" {

KELO_DOUBLE(DBConnect_tag *, KELODBConnect,
            (const char *host, const char *user, const char *password, const char *path),
            (host, user, password, path), path, nullptr, Opened)
KELO_DOUBLE(int, KELODBFetchRow, (DBResult_tag * result, unsigned int *row), (result, row), "", -1, )
KELO_DOUBLE(int, KELODBExecute, (DBConnect_tag * connection, const char *sql, DBResult_tag **result),
            (connection, sql, result), sql, -1, [result](int status) { return WithResult(status, result); })
KELO_DOUBLE(int, KELODBEscapeStringEX,
            (DBConnect_tag * connection, char *out, size_t outSize, const char *in, size_t inLen),
            (connection, out, outSize, in, inLen), in, -1, )
KELO_DOUBLE(int, KELODBEscapeStringEX2,
            (DBConnect_tag * connection, char *out, size_t outSize, const char *in, size_t inLen),
            (connection, out, outSize, in, inLen), in, -1, )
KELO_DOUBLE(int, KELODBEscapeBackslashEX2,
            (DBConnect_tag * connection, char *out, size_t outSize, const char *in),
            (connection, out, outSize, in), in, -1, )
KELO_DOUBLE(TORVSZHASH *, TORVCSzHashAlloc, (size_t size), (size), "", nullptr, Opened)
KELO_DOUBLE(int, TORVCExec,
            (const char *program, const char *arg1, const char *arg2, const char *arg3, const char *arg4),
            (program, arg1, arg2, arg3, arg4), program, -1, )
KELO_DOUBLE(int, KELOFSMkdirP, (const char *folder, int zero, int one, int uid, int gid, unsigned int mode),
            (folder, zero, one, uid, gid, mode), folder, -1, )

KELOSMSCONF *KELOSmsConfGet() {
    return MustFail("KELOSmsConfGet", "") ? nullptr : CallReal<&KELOSmsConfGet>("KELOSmsConfGet");
}

int KELODBSelectLimit(DBConnect_tag *connection, const char *sql, unsigned int limit, unsigned int offset,
                      DBResult_tag **result) {
    if (MustFail("KELODBSelectLimit", sql, limit, offset))
        return -1;
    return WithResult(KELO_REAL(KELODBSelectLimit, connection, sql, limit, offset, result), result);
}

int TORVCSzHashSetValue(TORVSZHASH **hash, const char *key, const char *value) {
    if (MustFail("TORVCSzHashSetValue", key))
        return -1;
    const int status = KELO_REAL(TORVCSzHashSetValue, hash, key, value);
    const FaultPause pause;
    if (status >= 0)
        hashes[*hash][key] = value;
    return status;
}

int KELOSysNotifySendNotificationCustomized(const char *tag, const char *textsDir, const char *filterFile,
                                            TORVSZHASH **hash, int zero) {
    if (MustFail("KELOSysNotifySendNotificationCustomized", tag))
        return -1;
    const FaultPause pause;
    PlatformCalls::Send({tag, textsDir, filterFile, hash != nullptr ? hashes[*hash] : hashes[nullptr]});
    const auto answer = PlatformCalls::answers.notification;
    return answer ? *answer
                  : KELO_REAL(KELOSysNotifySendNotificationCustomized, tag, textsDir, filterFile, hash, zero);
}

int KELODBClose(DBConnect_tag *connection) {
    return KELO_REAL(KELODBClose, Closing(connection));
}

void KELODBFreeResult(DBResult_tag *result) {
    KELO_REAL(KELODBFreeResult, Closing(result));
}

void TORVCSzHashFree(TORVSZHASH *hash) {
    KELO_REAL(TORVCSzHashFree, Closing(hash));
    const FaultPause pause;
    hashes.erase(hash);
}

} // extern "C"
