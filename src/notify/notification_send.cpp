#include "common/failure.h"
#include "common/string_map.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/notification.h"
#include "kelosyslog/utils.h"
#include "notify/service.h"

namespace {

constexpr char kNoMemory[] = "Fail to allocation memory";
constexpr char kFailedMail[] = "Failed to send email.";

int Fail(const std::string &text) {
    Debuger::MSG(0, text);
    return -1;
}

int FailWithoutMemory() {
    kelo::Fail(KELO_FAILURE_MEMORY, "", "TORVCSzHashSetValue", kNoMemory);
    return Fail(kNoMemory);
}

int SendContent(NotificationManager &manager, const char *tag, const std::string &host,
                const char *placeholder, const std::string &value, const std::string &content) {
    if (content.find(kFailedMail) != std::string::npos)
        return 0;
    kelo::SzHash values;
    if (!values)
        return FailWithoutMemory();
    const std::optional<std::string> escaped = kelo::EscapeContent(content.c_str());
    if (!escaped)
        return Fail("Not enough memory");
    if (!values.Set("%HOST%", host) || !values.Set(placeholder, value) ||
        !values.Set("%SYSLOG_CONTENT%", *escaped))
        return FailWithoutMemory();
    if (manager.NotificationSend(tag, values.Address()) < 0)
        return Fail("Fail to send notification");
    return 0;
}

} // namespace

int NotificationManager::NotificationSend(const char *tag, TORVSZHASH **hash) {
    const bool isClassSet =
        TORVCSzHashSetValue(hash, "DESKTOP_NOTIFY_CLASSNAME", "KELO.ZRT.Quillbay.BuiltIn") >= 0;
    if (!isClassSet)
        kelo::FailPlatform("", "TORVCSzHashSetValue");
    if (!isClassSet || kelo::SendToService(tag, hash) < 0)
        return Fail(std::string("Fail to send notification: ") + (tag != nullptr ? tag : ""));
    return 0;
}

int NotificationManager::NotificationSendEps(uint64_t eps) {
    const uint64_t threshold = epsRules.empty() ? 0 : epsRules.front().eps;
    kelo::SzHash values;
    if (!values || !values.Set("%EPS%", ullNumberToString(eps)) ||
        !values.Set("%TOLERNCE%", ullNumberToString(threshold)))
        return FailWithoutMemory();
    if (NotificationSend("KELOSYSLOG_EPS_EXCEED", values.Address()) < 0)
        return Fail("Fail to send notification");
    return 0;
}

int NotificationManager::NotificationSendVolFull(const std::string &share) {
    kelo::SzHash values;
    if (!values || !values.Set("%SHARED_FOLDER%", share))
        return FailWithoutMemory();
    if (NotificationSend("KELOSYSLOG_VOL_FULL", values.Address()) < 0)
        return Fail("Fail to send notification");
    return 0;
}

int NotificationManager::NotificationSendSev(const std::string &host, const std::string &sev,
                                             const std::string &content) {
    return SendContent(*this, "KELOSYSLOG_SEV_EXCEED", host, "%SEV%", sev, content);
}

int NotificationManager::NotificationSendSev(const std::string &host, _SYSLOG_DB_PRIORITY_tag pri,
                                             const _SYSLOG_LOG_DATA_tag &log) {
    return NotificationSendSev(host, PriorTypeToStr(pri), log.msg);
}

int NotificationManager::NotificationSendKeyword(const std::string &host, const std::string &keyword,
                                                 const std::string &content) {
    return SendContent(*this, "KELOSYSLOG_KEYWORD_MATCH", host, "%KEYWORD%", keyword, content);
}

int NotificationManager::NotificationSendKeyword(const std::string &host, const std::string &keyword,
                                                 const _SYSLOG_LOG_DATA_tag &log) {
    return NotificationSendKeyword(host, keyword, log.msg);
}
