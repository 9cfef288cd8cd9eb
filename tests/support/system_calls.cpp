#include "support/system_calls.h"

#include <cstdio>
#include <initializer_list>
#include <string>

#include "keloplatform/kelosystem.h"
#include "keloplatform/torvc.h"
#include "support/fault_pause.h"
#include "support/platform_calls.h"
#include "support/real_function.h"

namespace kelo::test {
namespace {

bool reloadAnswer = true;
std::function<void()> lookAtReload;

bool MustFailToRun(std::initializer_list<const char *> words) {
    const FaultPause pause;
    std::string text;
    for (const char *word : words) {
        if (word != nullptr)
            text += (text.empty() ? "" : " ") + std::string(word);
    }
    return PlatformCalls::MustFail("TORVCExec", text.c_str());
}

} // namespace

void SystemCalls::Reset() {
    reloadAnswer = true;
    lookAtReload = nullptr;
}
void SystemCalls::AnswerReloadWith(bool result) {
    reloadAnswer = result;
}
void SystemCalls::OnReload(std::function<void()> look) {
    lookAtReload = std::move(look);
}

} // namespace kelo::test

using namespace kelo::test;

bool KELOSystemdReload(const std::string &service) {
    if (PlatformCalls::MustFail("KELOSystemdReload", service.c_str()))
        return false;
    if (lookAtReload)
        lookAtReload();
    return reloadAnswer;
}

extern "C" {

int TORVCExec(const char *program, const char *arg1, const char *arg2, const char *arg3, const char *arg4) {
    return MustFailToRun({program, arg1, arg2, arg3, arg4})
               ? -1
               : Real<&TORVCExec>("TORVCExec")(program, arg1, arg2, arg3, arg4);
}

int KELOFSMkdirP(const char *folder, int zero, int one, int uid, int gid, unsigned int mode) {
    char text[1024];
    std::snprintf(text, sizeof text, "%s %d %d %d %d %o", folder, zero, one, uid, gid, mode);
    if (PlatformCalls::MustFail("KELOFSMkdirP", text))
        return -1;
    return Real<&KELOFSMkdirP>("KELOFSMkdirP")(folder, zero, one, uid, gid, mode);
}

} // extern "C"
