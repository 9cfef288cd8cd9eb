#include "notify/service.h"

#include "common/failure.h"
#include "common/root.h"
#include "keloplatform/kelonotify.h"
#include "kelosyslog/utils.h"

namespace kelo {

int SendToService(const char *tag, TORVSZHASH **hash) {
    const std::string texts = RootedPath("/usr/kelo/keloman/webman/modules/Quillbay/texts/");
    const std::string filter = RootedPath("/etc/kelosyslog/notify.filter");
    if (KELOSysNotifySendNotificationCustomized(tag, texts.c_str(), filter.c_str(), hash, 0) >= 0)
        return 0;
    return FailPlatform("", "KELOSysNotifySendNotificationCustomized");
}

std::optional<std::string> EscapeContent(const char *content) {
    char escaped[kContentSize] = {};
    if (EncodeJson(content, escaped, kContentSize) < 0) // that is the thread's last failure
        return std::nullopt;
    return escaped;
}

} // namespace kelo
