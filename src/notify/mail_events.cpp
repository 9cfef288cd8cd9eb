#include "common/failure.h"
#include "common/report.h"
#include "common/string_map.h"
#include "kelosyslog/notification.h"
#include "notify/service.h"

namespace {

int FailForNull() {
    return kelo::Fail(KELO_FAILURE_ARGUMENT, "", "", "a null pointer");
}

int FailForMemory() {
    return kelo::Fail(KELO_FAILURE_MEMORY, "", "TORVCSzHashSetValue", "Fail to allocation memory");
}

int SendShareEvent(const char *tag, const char *share) {
    if (share == nullptr)
        return FailForNull();
    kelo::SzHash values;
    if (!values || !values.Set("%SHARED_FOLDER%", share))
        return FailForMemory();
    return SyslogMailSend(tag, values.Address()) < 0 ? -1 : 0;
}

int SendContentEvent(const char *tag, const char *placeholder, const char *value, const char *content) {
    if (value == nullptr || content == nullptr)
        return FailForNull();
    kelo::SzHash values;
    if (!values)
        return FailForMemory();
    const std::optional<std::string> escaped = kelo::EscapeContent(content);
    if (!escaped)
        return -1;
    if (!values.Set(placeholder, value) || !values.Set("%SYSLOG_CONTENT%", *escaped))
        return FailForMemory();
    return SyslogMailSend(tag, values.Address()) < 0 ? -1 : 0;
}

} // namespace

int SyslogMailSend(const char *tag, TORVSZHASH **hash) {
    if (kelo::SendToService(tag, hash) >= 0)
        return 0;
    kelo::ReportError(std::string("Fail to send notification: ") + (tag != nullptr ? tag : ""));
    return -1;
}

int SyslogMailShareRemove(const char *share) {
    return SendShareEvent("KELOSYSLOG_ShareRemove", share);
}
int SyslogMailShareRename(const char *share) {
    return SendShareEvent("KELOSYSLOG_ShareRename", share);
}
int SyslogMailShareEncMount(const char *share) {
    return SendShareEvent("KELOSYSLOG_ShareEncMount", share);
}
int SyslogMailShareEncUnmount(const char *share) {
    return SendShareEvent("KELOSYSLOG_ShareEncUnmount", share);
}

int SyslogMailSeverityExceeded(const char *sev, const char *content) {
    return SendContentEvent("KELOSYSLOG_SEV_EXCEED", "%SEV%", sev, content);
}
int SyslogMailKeywordMatched(const char *keyword, const char *content) {
    return SendContentEvent("KELOSYSLOG_KEYWORD_MATCH", "%KEYWORD%", keyword, content);
}
