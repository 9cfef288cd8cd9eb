#include "commands/rule_set.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>

#include "base/errors.h"
#include "base/json.h"
#include "base/text_encoding.h"
#include "cli/exit_status.h"
#include "cli/program.h"
#include "keloplatform/torvc.h"
#include "print/output.h"

namespace kelo::tool {
namespace {

struct ListFreer {
    void operator()(TORVSZLIST *list) const { TORVCSzListFree(list); }
};

std::vector<std::string> SectionNames(const std::string &path) {
    constexpr size_t kRoom = 64;
    std::unique_ptr<TORVSZLIST, ListFreer> owned(TORVCSzListAlloc(kRoom));
    if (owned == nullptr)
        throw std::bad_alloc();
    if (!TORVCFileExist(path.c_str()))
        return {};
    TORVSZLIST *list = owned.release();
    const int status = TORVCFileEnumSection(path.c_str(), &list);
    owned.reset(list);
    if (status < 0)
        throw DatabaseError(path + ": " + std::strerror(errno));
    return {owned->items, owned->items + owned->count};
}

const char *TypeName(int32_t type) {
    constexpr const char *kNames[] = {"severity", "eps", "keyword"};
    return type >= kSeverityRule && type <= kKeywordRule ? kNames[type] : "unknown";
}

void AppendJson(std::string &out, const _SYSLOG_NOTIFY_RULES_tag &rule) {
    JsonObject object(out);
    object.Add("name", rule.name);
    object.Add("type", TypeName(rule.type));
    object.AddJson("severity", std::to_string(rule.pri));
    object.AddJson("eps", std::to_string(rule.eps));
    object.Add("keyword", rule.pattern);
    object.AddJson("enabled", rule.enable ? "true" : "false");
    object.End();
}

} // namespace

const _SYSLOG_NOTIFY_RULES_tag *RuleSet::Find(const std::string &name) const {
    const auto found =
        std::find_if(rules.begin(), rules.end(), [&](const auto &rule) { return rule.name == name; });
    return found != rules.end() ? &*found : nullptr;
}

void RuleSet::RequireReadable(const std::string &path) const {
    if (!broken.empty())
        throw DatabaseError(path + ": section [" + broken + "] cannot be read; mend or remove it first");
}

RuleSet LoadRules(const std::string &path) {
    RuleSet set;
    for (const std::string &name : SectionNames(path)) {
        _SYSLOG_NOTIFY_RULES_tag rule;
        if (SyslogNotifyConfGet(path, name, rule) != 0) {
            set.broken = name;
            break;
        }
        set.rules.push_back(rule);
    }
    return set;
}

bool IsJson(const std::string &format) {
    if (format != "text" && format != "json")
        throw UsageError("--output: '" + format + "' is no format; formats are text, json");
    return format == "json";
}

std::string DescribeRule(const _SYSLOG_NOTIFY_RULES_tag &rule) {
    switch (rule.type) {
    case kSeverityRule:
        return "severity " +
               (rule.pri >= SYSLOG_PRIO_EMERG && rule.pri <= SYSLOG_PRIO_DEBUG ? PriorTypeToStr(rule.pri)
                                                                               : std::to_string(rule.pri)) +
               " and worse";
    case kEpsRule:
        return std::to_string(rule.eps) + " logs a second and more";
    case kKeywordRule:
        return rule.pattern.empty() ? "empty keyword: never" : "message with " + rule.pattern;
    default:
        return "unknown type " + std::to_string(rule.type) + ": ignored";
    }
}

int PrintRules(const RuleSet &set, const std::string &path, const std::string &format) {
    const bool isJson = IsJson(format);
    JsonLines lines(isJson);
    std::string text;
    lines.Begin(text);
    for (const _SYSLOG_NOTIFY_RULES_tag &rule : set.rules) {
        lines.BeginItem(text);
        if (isJson)
            AppendJson(text, rule);
        else
            text += std::string(rule.enable ? "on   " : "off  ") + EscapeForTerminal(rule.name) + ": " +
                    EscapeForTerminal(DescribeRule(rule));
        lines.EndItem(text);
    }
    lines.End(text);
    Output output(true);
    output.Write(text);
    output.Finish();
    if (!set.broken.empty()) {
        PrintMessage(path + ": section [" + set.broken +
                     "] cannot be read; it and the rules after it are not in force");
        return kExitDatabase;
    }
    return set.rules.empty() ? kExitNothing : kExitFound;
}

} // namespace kelo::tool
