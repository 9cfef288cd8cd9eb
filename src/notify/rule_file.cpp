#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "common/failure.h"
#include "common/report.h"
#include "common/string_map.h"
#include "kelosyslog/notification.h"
#include "kelosyslog/utils.h"

namespace {

constexpr char kRuleSource[] = "utils";
constexpr char kLineFormat[] = "%s=\"%s\"\n";

const char *TextOf(const kelo::SzHash &section, const char *key) {
    const char *value = section.Get(key);
    return value != nullptr ? value : "";
}

int32_t NumberOf(const kelo::SzHash &section, const char *key) {
    return static_cast<int32_t>(std::strtol(TextOf(section, key), nullptr, 10));
}

// The decimal form of a signed number's 64 bits: -1 gives 18446744073709551615.
std::string SignExtended(int32_t number) {
    return ullNumberToString(static_cast<unsigned long long>(static_cast<long long>(number)));
}

bool FillSection(kelo::SzHash &section, const _SYSLOG_NOTIFY_RULES_tag &rule) {
    return section.Set("notify_type", SignExtended(rule.type)) &&
           section.Set("notify_eps", SignExtended(static_cast<int32_t>(rule.eps))) &&
           section.Set("notify_pri", SignExtended(rule.pri)) && section.Set("notify_pat", rule.pattern) &&
           section.Set("notify_enable", rule.enable ? "1" : "0");
}

bool HoldsNul(const _SYSLOG_NOTIFY_RULES_tag &rule) {
    return rule.name.find('\0') != std::string::npos || rule.pattern.find('\0') != std::string::npos;
}

// Reports what failed under the line number of its message.
int FailAt(int line, const char *message, const std::string &path, const char *function) {
    kelo::FailPlatform(path, function);
    kelo::ReportErrorAt(kRuleSource, line, message);
    return -1;
}

} // namespace

int SyslogNotifyConfGet(const std::string &path, const std::string &section, _SYSLOG_NOTIFY_RULES_tag &rule) {
    kelo::SzHash values;
    if (!values)
        return FailAt(81, "Fail to allocate memory", "", "TORVCSzHashAlloc");
    if (TORVCFileGetSection(path.c_str(), section.c_str(), values.Address()) < 0)
        return FailAt(85, "Fail to do TORVCFileGetSection", path, "TORVCFileGetSection");
    rule.name = section;
    rule.type = NumberOf(values, "notify_type");
    rule.pri = static_cast<_SYSLOG_DB_PRIORITY_tag>(NumberOf(values, "notify_pri"));
    rule.eps = static_cast<uint64_t>(std::strtoll(TextOf(values, "notify_eps"), nullptr, 10));
    rule.pattern = TextOf(values, "notify_pat");
    rule.enable = std::strcmp(TextOf(values, "notify_enable"), "1") == 0;
    return 0;
}

int SyslogNotifyConfSet(const std::string &path, const std::string &, const _SYSLOG_NOTIFY_RULES_tag &rule) {
    kelo::SzHash values;
    if (!values || !FillSection(values, rule))
        return FailAt(124, "Fail to allocate memory", "",
                      values ? "TORVCSzHashSetValue" : "TORVCSzHashAlloc");
    // A C string would end at a NUL byte and lose the rest.
    if (HoldsNul(rule)) {
        kelo::ReportErrorAt(kRuleSource, 139, "Fail set section to file");
        return kelo::Fail(KELO_FAILURE_ARGUMENT, path, rule.name, "the name or the pattern holds a NUL byte");
    }
    if (TORVCFileSetSection(path.c_str(), rule.name.c_str(), rule.name.c_str(), *values.Address(),
                            kLineFormat) < 0)
        return FailAt(139, "Fail set section to file", path, "TORVCFileSetSection");
    return 0;
}
