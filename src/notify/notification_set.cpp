#include <cstring>
#include <memory>
#include <string>

#include "common/failure.h"
#include "common/report.h"
#include "common/root.h"
#include "keloplatform/kelonotify.h"
#include "keloplatform/torvc.h"
#include "kelosyslog/notification.h"

namespace {

constexpr char kSource[] = "utils";

struct SmsConfFreer {
    void operator()(KELOSMSCONF *conf) const { KELOSmsConfFree(conf); }
};

struct Switch {
    const char *key;
    int line;
    const char *message;
};
constexpr Switch kMailSwitch = {"smtp_mail_enabled", 166, "Fail to get smtp mail setting"};
constexpr Switch kPushSwitches[] = {
    {"pushservice_mobile_enabled", 188, "Fail to get mobile setting"},
    {"pushservice_msn_enabled", 196, "Fail to get msn setting"},
    {"pushservice_skype_enabled", 204, "Fail to get skype setting"},
};

// False after a message when the switch cannot be read.
bool ReadSwitch(const std::string &path, const Switch &which, bool &on) {
    char value[16] = {};
    if (TORVCFileGetKeyValue(path.c_str(), which.key, value, sizeof value, 0) < 0) {
        kelo::FailPlatform(path, "TORVCFileGetKeyValue");
        kelo::ReportErrorAt(kSource, which.line, which.message);
        return false;
    }
    on = std::strcmp(value, "yes") == 0;
    return true;
}

} // namespace

bool IsNotificationSet() {
    const std::string settings = kelo::RootedPath("/etc/keloinfo.conf");
    KELOMAIL mail{};
    if (KELOMailGet(&mail) < 0) {
        kelo::FailPlatform(settings, "KELOMailGet");
        kelo::ReportErrorAt(kSource, 161, "Fail to get mail setting");
        return false;
    }
    bool isMailSwitchedOn = false;
    if (!ReadSwitch(settings, kMailSwitch, isMailSwitchedOn))
        return false;
    const bool isMailOn = isMailSwitchedOn && mail.server[0] != '\0' && KELOMailGetMailNum(&mail) > 0;

    const std::unique_ptr<KELOSMSCONF, SmsConfFreer> sms(KELOSmsConfGet());
    if (sms == nullptr) {
        kelo::FailPlatform(settings, "KELOSmsConfGet");
        kelo::ReportErrorAt(kSource, 178, "Fail to get sms setting");
        return false;
    }
    bool isAnyPushOn = false;
    for (const Switch &push : kPushSwitches) {
        bool isOn = false;
        if (!ReadSwitch(settings, push, isOn))
            return false;
        isAnyPushOn = isAnyPushOn || isOn;
    }
    return sms->enabled != 0 || isMailOn || isAnyPushOn;
}
