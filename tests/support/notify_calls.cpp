#include "support/notify_calls.h"

#include "keloplatform/kelonotify.h"
#include "keloplatform/torvc.h"
#include "support/fault_pause.h"
#include "support/platform_calls.h"
#include "support/real_function.h"

namespace kelo::test {
namespace {

struct State {
    std::map<const TORVSZHASH *, std::map<std::string, std::string>> hashes;
    std::vector<SentNotification> sent;
    std::optional<int> answer = 0;
};
State state;

} // namespace

void NotifyCalls::Reset() {
    state.sent.clear();
    state.answer = 0;
}
void NotifyCalls::AnswerWith(std::optional<int> result) {
    state.answer = result;
}
const std::vector<SentNotification> &NotifyCalls::Sent() {
    return state.sent;
}
int NotifyCalls::OpenHandles() {
    return static_cast<int>(state.hashes.size());
}

} // namespace kelo::test

using namespace kelo::test;

#define KELO_REAL(function) Real<&function>(#function)

extern "C" {

TORVSZHASH *TORVCSzHashAlloc(size_t size) {
    if (PlatformCalls::MustFail("TORVCSzHashAlloc", ""))
        return nullptr;
    TORVSZHASH *hash = KELO_REAL(TORVCSzHashAlloc)(size);
    const FaultPause pause;
    if (hash != nullptr)
        state.hashes[hash];
    return hash;
}

int TORVCSzHashSetValue(TORVSZHASH **hash, const char *key, const char *value) {
    if (PlatformCalls::MustFail("TORVCSzHashSetValue", key))
        return -1;
    const int status = KELO_REAL(TORVCSzHashSetValue)(hash, key, value);
    const FaultPause pause;
    if (status >= 0)
        state.hashes[*hash][key] = value;
    return status;
}

void TORVCSzHashFree(TORVSZHASH *hash) {
    {
        const FaultPause pause;
        state.hashes.erase(hash);
    }
    KELO_REAL(TORVCSzHashFree)(hash);
}

KELOSMSCONF *KELOSmsConfGet() {
    return PlatformCalls::MustFail("KELOSmsConfGet", "") ? nullptr : KELO_REAL(KELOSmsConfGet)();
}

int KELOSysNotifySendNotificationCustomized(const char *tag, const char *textsDir, const char *filterFile,
                                            TORVSZHASH **hash, int zero) {
    if (PlatformCalls::MustFail("KELOSysNotifySendNotificationCustomized", tag))
        return -1;
    const FaultPause pause;
    const bool hasValues = hash != nullptr && *hash != nullptr;
    state.sent.push_back(
        {tag, textsDir, filterFile, hasValues ? state.hashes[*hash] : decltype(SentNotification::values)()});
    if (state.answer)
        return *state.answer;
    return KELO_REAL(KELOSysNotifySendNotificationCustomized)(tag, textsDir, filterFile, hash, zero);
}

} // extern "C"
