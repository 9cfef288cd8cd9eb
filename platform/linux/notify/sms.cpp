#include "common/catch_bad_alloc.h"
#include "common/failure.h"
#include "keloplatform/kelonotify.h"
#include "notify/settings.h"

using namespace kelo::platform;

KELOSMSCONF *KELOSmsConfGet() {
    const auto read = []() -> KELOSMSCONF * {
        const Settings settings;
        if (!settings.IsLoaded())
            return nullptr;
        auto conf = std::make_unique<KELOSMSCONF>();
        conf->enabled = settings.IsOn("sms_enabled") ? 1 : 0;
        const bool complete = settings.CopyTo(conf->url, "sms_url") &&
                              settings.CopyTo(conf->body, "sms_body") &&
                              settings.CopyTo(conf->contentType, "sms_content_type") &&
                              settings.CopyTo(conf->numbers, "sms_to");
        return complete ? conf.release() : nullptr;
    };
    return Recorded("KELOSmsConfGet", nullptr, CatchBadAlloc<KELOSMSCONF *>(nullptr, read));
}

void KELOSmsConfFree(KELOSMSCONF *conf) {
    delete conf;
}
