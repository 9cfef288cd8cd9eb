#include <cerrno>
#include <cstring>

#include "common/catch_bad_alloc.h"
#include "common/failure.h"
#include "files/refusal.h"
#include "keloplatform/kelonotify.h"
#include "notify/channels.h"
#include "notify/spool.h"

using namespace kelo::platform;

namespace {

bool Send(const std::string &tag, const std::string &textsDir, const std::string &filterFile,
          const TORVSZHASH &values) {
    const Settings settings;
    if (!settings.IsLoaded() && errno != ENOENT)
        ReportRefusal(settings.Path(), 0, std::string("not read: ") + std::strerror(errno));
    SpoolEntry entry;
    entry.channels = WantedChannels(settings, filterFile, tag);
    if (entry.channels.empty())
        return true;
    entry.tag = tag;
    entry.language = settings.Get("notify_language", "enu");
    entry.message = RenderMessage(tag, textsDir, entry.language, values);
    entry.values = &values;
    return AddToSpool(entry);
}

const char *TextOf(const char *text) {
    return text != nullptr ? text : "";
}

} // namespace

int KELOSysNotifySendNotificationCustomized(const char *tag, const char *textsDir, const char *filterFile,
                                            TORVSZHASH **hash, int) {
    ClearFailure();
    const bool isSent = CatchBadAlloc(false, [&] {
        if (tag == nullptr || tag[0] == '\0') {
            errno = EINVAL;
            return false;
        }
        const TORVSZHASH none;
        const bool hasValues = hash != nullptr && *hash != nullptr;
        return Send(tag, TextOf(textsDir), TextOf(filterFile), hasValues ? **hash : none);
    });
    if (isSent)
        return 0;
    FailWithErrno("KELOSysNotifySendNotificationCustomized", "", errno);
    ReportFailure("Cannot put notification \"%s\" into the spool: %m", TextOf(tag));
    return -1;
}
