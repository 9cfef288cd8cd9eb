#include "common/failure.h"
#include "common/root.h"
#include "common/string_map.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/notification.h"

namespace {

enum RuleType : int32_t { kSeverityRule = 0, kEpsRule = 1, kKeywordRule = 2 };

} // namespace

NotificationManager::NotificationManager() {
    if (ConfigLoad(kelo::RootedPath("/etc/kelosyslog/notify.conf")) != 0)
        Debuger::MSG(0, "Fail to load configuration");
}

NotificationManager::~NotificationManager() = default;

int NotificationManager::ConfigLoad(const std::string &path) {
    kelo::SzList sections(TORVCSzListAlloc(kelo::kSzCapacity));
    if (sections == nullptr) {
        kelo::FailPlatform("", "TORVCSzListAlloc");
        Debuger::MSG(0, "Fail to allocate memory");
        return -1;
    }
    // The platform may reallocate the list.
    TORVSZLIST *list = sections.release();
    const int status = TORVCFileEnumSection(path.c_str(), &list);
    sections.reset(list);
    if (status < 0) {
        kelo::FailPlatform(path, "TORVCFileEnumSection");
        Debuger::MSG(0, "Fail to do TORVCFileEnumSection");
        return -1;
    }
    for (int i = 0; i < sections->count; ++i) {
        const char *section = sections->items[i];
        _SYSLOG_NOTIFY_RULES_tag rule;
        if (SyslogNotifyConfGet(path, section, rule) < 0) {
            Debuger::MSG(0, std::string("Fail to get notification setting ") + section);
            return 0;
        }
        if (rule.type == kSeverityRule)
            sevRules.push_back(rule);
        else if (rule.type == kEpsRule)
            epsRules.push_back(rule);
        else if (rule.type == kKeywordRule)
            kwRules.push_back(rule);
    }
    return 0;
}

bool NotificationManager::CheckEps(uint64_t eps) const {
    for (const _SYSLOG_NOTIFY_RULES_tag &rule : epsRules) {
        if (rule.enable && rule.eps <= eps)
            return true;
    }
    return false;
}

bool NotificationManager::CheckSev(_SYSLOG_DB_PRIORITY_tag pri) const {
    for (const _SYSLOG_NOTIFY_RULES_tag &rule : sevRules) {
        if (rule.enable && rule.pri >= pri)
            return true;
    }
    return false;
}

std::string NotificationManager::CheckKeyword(const std::string &content) const {
    for (const _SYSLOG_NOTIFY_RULES_tag &rule : kwRules) {
        if (rule.enable && !rule.pattern.empty() && content.find(rule.pattern) != std::string::npos)
            return rule.pattern;
    }
    return "";
}
