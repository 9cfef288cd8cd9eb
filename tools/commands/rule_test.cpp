#include "commands/rule_test.h"

#include "base/errors.h"
#include "base/json.h"
#include "base/text_encoding.h"
#include "cli/exit_status.h"
#include "cli/program.h"
#include "commands/rule_set.h"
#include "print/output.h"
#include "read/log_reader.h"

namespace kelo::tool {
namespace {

constexpr uint64_t kDefaultLogs = 100;
constexpr uint64_t kMaxLogs = 1'000'000;

bool Fires(const _SYSLOG_NOTIFY_RULES_tag &rule, const RuleTestOptions &options) {
    if (!rule.enable)
        return false;
    if (rule.type == kSeverityRule)
        return options.hasSeverity && rule.pri >= options.severity;
    if (rule.type == kEpsRule)
        return options.hasEps && rule.eps <= options.eps;
    return rule.type == kKeywordRule && !rule.pattern.empty() &&
           options.text.find(rule.pattern) != std::string::npos;
}

// A rule, or the tested part of a record, and the match.
using Findings = std::vector<std::pair<std::string, std::string>>;

int Print(const Findings &findings, bool isJson) {
    JsonLines lines(isJson);
    std::string text;
    lines.Begin(text);
    for (const auto &[name, what] : findings) {
        lines.BeginItem(text);
        if (isJson) {
            JsonObject object(text);
            object.Add("name", name);
            object.Add("fires_for", what);
            object.End();
        } else {
            text += EscapeForTerminal(name) + ": " + EscapeForTerminal(what);
        }
        lines.EndItem(text);
    }
    lines.End(text);
    Output output(true);
    output.Write(text);
    output.Finish();
    return findings.empty() ? kExitNothing : kExitFound;
}

// Checks a record and sends its notifications. Returns the number that could not be sent.
int CheckLog(NotificationManager &manager, const _SYSLOG_LOG_DATA_tag &log, const RuleTestOptions &options,
             Findings &findings) {
    int failures = 0;
    if (manager.CheckSev(log.prio)) {
        findings.emplace_back("severity " + PriorTypeToStr(log.prio), log.host + ": " + log.msg);
        failures += options.mustNotify && manager.NotificationSendSev(log.host, log.prio, log) != 0 ? 1 : 0;
    }
    if (const std::string keyword = manager.CheckKeyword(log.msg); !keyword.empty()) {
        findings.emplace_back("keyword " + keyword, log.host + ": " + log.msg);
        failures +=
            options.mustNotify && manager.NotificationSendKeyword(log.host, keyword, log) != 0 ? 1 : 0;
    }
    return failures;
}

int TestStoredLogs(const RuleTestOptions &options, bool isJson, const std::string &root) {
    const LogTable table = ResolveLogTable(options.table, root);
    if (table.kind != TableKind::Logs)
        throw UsageError("--log: rules are tested on table logs only, not on '" + options.table.log + "'");
    const uint64_t count =
        options.lines.empty() ? kDefaultLogs : ParseNumber("--lines", options.lines, 1, kMaxLogs);
    NotificationManager manager;
    Findings findings;
    int failures = 0;
    LogReader(table, {}).ReadPage({count, 0}, true, [&](const _SYSLOG_LOG_DATA_tag &log) {
        failures += CheckLog(manager, log, options, findings);
    });
    const int status = Print(findings, isJson);
    if (failures > 0)
        throw DatabaseError(std::to_string(failures) +
                            " notifications could not be sent; the system log tells why");
    return status;
}

} // namespace

int TestRules(const RuleTestOptions &options, const std::string &path, const std::string &root) {
    const bool isJson = IsJson(options.format);
    const RuleSet rules = LoadRules(path);
    if (!rules.broken.empty())
        PrintMessage(path + ": section [" + rules.broken +
                     "] cannot be read; it and the rules after it are not in force");
    const bool isGiven = options.hasSeverity || options.hasEps || !options.text.empty();
    const bool namesLogs = options.mustNotify || !options.lines.empty() || !options.table.db.empty() ||
                           !options.table.log.empty();
    if (isGiven && namesLogs)
        throw UsageError("rules test: --severity, --eps and --text go with no option about stored logs");
    if (!isGiven)
        return TestStoredLogs(options, isJson, root);
    Findings findings;
    for (const _SYSLOG_NOTIFY_RULES_tag &rule : rules.rules) {
        if (Fires(rule, options))
            findings.emplace_back(rule.name, DescribeRule(rule));
    }
    return Print(findings, isJson);
}

} // namespace kelo::tool
