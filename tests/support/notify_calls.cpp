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
    int openLists = 0;
    int openSmsConfs = 0;
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
    return static_cast<int>(state.hashes.size()) + state.openLists + state.openSmsConfs;
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

TORVSZLIST *TORVCSzListAlloc(size_t size) {
    if (PlatformCalls::MustFail("TORVCSzListAlloc", ""))
        return nullptr;
    TORVSZLIST *list = KELO_REAL(TORVCSzListAlloc)(size);
    state.openLists += list != nullptr;
    return list;
}

void TORVCSzListFree(TORVSZLIST *list) {
    if (list != nullptr)
        --state.openLists;
    KELO_REAL(TORVCSzListFree)(list);
}

int TORVCFileEnumSection(const char *path, TORVSZLIST **list) {
    return PlatformCalls::MustFail("TORVCFileEnumSection", path)
               ? -1
               : KELO_REAL(TORVCFileEnumSection)(path, list);
}

int TORVCFileGetSection(const char *path, const char *section, TORVSZHASH **hash) {
    if (PlatformCalls::MustFail("TORVCFileGetSection", section))
        return -1;
    return KELO_REAL(TORVCFileGetSection)(path, section, hash);
}

int TORVCFileSetSection(const char *path, const char *section, const char *newName, TORVSZHASH *hash,
                        const char *lineFormat) {
    if (PlatformCalls::MustFail("TORVCFileSetSection", section))
        return -1;
    return KELO_REAL(TORVCFileSetSection)(path, section, newName, hash, lineFormat);
}

int TORVCFileGetKeyValue(const char *path, const char *key, char *buffer, size_t size, int zero) {
    if (PlatformCalls::MustFail("TORVCFileGetKeyValue", key))
        return -1;
    return KELO_REAL(TORVCFileGetKeyValue)(path, key, buffer, size, zero);
}

int KELOMailGet(KELOMAIL *mail) {
    return PlatformCalls::MustFail("KELOMailGet", "") ? -1 : KELO_REAL(KELOMailGet)(mail);
}

KELOSMSCONF *KELOSmsConfGet() {
    if (PlatformCalls::MustFail("KELOSmsConfGet", ""))
        return nullptr;
    KELOSMSCONF *conf = KELO_REAL(KELOSmsConfGet)();
    state.openSmsConfs += conf != nullptr;
    return conf;
}

void KELOSmsConfFree(KELOSMSCONF *conf) {
    state.openSmsConfs -= conf != nullptr;
    KELO_REAL(KELOSmsConfFree)(conf);
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
