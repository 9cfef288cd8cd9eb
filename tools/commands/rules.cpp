// kelosyslog rules: shows, changes and tests the notification rules.

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "base/errors.h"
#include "base/text_encoding.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "commands/rule_set.h"
#include "commands/rule_test.h"
#include "commands/tell_receiver.h"
#include "keloplatform/torvc.h"
#include "read/severity_filter.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "Actions:\n"
    "  list                    Print the rules\n"
    "  add NAME, set NAME      Add a rule, or change one: with --severity, --eps or --keyword\n"
    "  enable, disable NAME... Switch rules\n"
    "  remove NAME...          Remove rules\n"
    "  test                    Print the rules that fire for a --severity, --eps or --text, or else for the\n"
    "                          newest stored logs; --notify sends the notifications of those logs\n\n"
    "A receiver that runs takes changed rules over at once.\n\n"
    "Examples:\n"
    "  kelosyslog rules add errors --severity err\n"
    "  kelosyslog rules add busy --eps 500 --disabled\n"
    "  kelosyslog rules test --text 'disk full'\n\n"
    "Exit status: 0 done or a rule fires, 1 no rule, 2 usage, 3 file or database, 4 output.";

constexpr uint64_t kMaxEps = 2147483647; // the largest number that the rule file gives back unchanged

struct Options {
    std::string action;
    std::vector<std::string> names;
    std::string severity;
    std::string eps;
    std::string keyword;
    bool isDisabled = false;
    RuleTestOptions test;
};

bool IsGiven(const std::string &value) {
    return !value.empty();
}

_SYSLOG_DB_PRIORITY_tag ParseSeverity(const std::string &text) {
    try {
        return ParseSeverities({text + ".." + text}).included.front();
    } catch (const UsageError &) {
        throw UsageError("--severity: '" + text +
                         "' is no level; levels are emerg, alert, crit, err, warning, "
                         "notice, info, debug and 0 to 7");
    }
}

// Of --severity, --eps and --keyword exactly one makes a rule.
void Describe(_SYSLOG_NOTIFY_RULES_tag &rule, const Options &options) {
    if (IsGiven(options.severity) + IsGiven(options.eps) + IsGiven(options.keyword) != 1)
        throw UsageError("rules " + options.action + ": needs one of --severity, --eps and --keyword");
    rule.pri = SYSLOG_PRIO_EMERG;
    rule.eps = 0;
    rule.pattern = options.keyword;
    rule.type = IsGiven(options.severity) ? kSeverityRule : IsGiven(options.eps) ? kEpsRule : kKeywordRule;
    if (IsGiven(options.severity))
        rule.pri = ParseSeverity(options.severity);
    if (IsGiven(options.eps))
        rule.eps = ParseNumber("--eps", options.eps, 0, kMaxEps);
}

void Write(const std::string &path, _SYSLOG_NOTIFY_RULES_tag rule) {
    if (rule.eps > kMaxEps)
        throw UsageError("rules: the threshold " + std::to_string(rule.eps) + " of rule '" + rule.name +
                         "' is above " + std::to_string(kMaxEps) +
                         " and would not be stored as it is; change the rule with 'set', or with an editor");
    if (SyslogNotifyConfSet(path, rule.name, rule) != 0)
        throw DatabaseError(
            "rule '" + rule.name + "' cannot be written to " + path + ": " +
            (errno == EINVAL ? "the file cannot hold its name or keyword" : std::strerror(errno)));
}

// Throws UsageError if the change does not fit the existing rules.
void RequireSuitable(const RuleSet &rules, const std::string &path, const Options &options) {
    if (options.action != "remove")
        rules.RequireReadable(path);
    for (const std::string &name : options.names) {
        const bool exists = rules.Find(name) != nullptr || rules.IsBroken(name);
        if (options.action == "add" && exists)
            throw UsageError("rules add: '" + name + "' exists; use set");
        if (options.action != "add" && !exists)
            throw UsageError("rules " + options.action + ": no rule '" + name + "' in " + path);
    }
}

void Remove(const std::string &path, const std::string &name) {
    if (TORVCFileSetSection(path.c_str(), name.c_str(), nullptr, nullptr, nullptr) < 0)
        throw DatabaseError("rule '" + name + "' cannot be removed from " + path + ": " +
                            std::strerror(errno));
}

void Change(const std::string &path, const Options &options) {
    const RuleSet rules = LoadRules(path);
    RequireSuitable(rules, path, options);
    for (const std::string &name : options.names) {
        if (options.action == "remove") {
            Remove(path, name);
            continue;
        }
        const _SYSLOG_NOTIFY_RULES_tag *old = rules.Find(name);
        _SYSLOG_NOTIFY_RULES_tag rule = old != nullptr ? *old : _SYSLOG_NOTIFY_RULES_tag{};
        rule.name = name;
        if (options.action == "add" || options.action == "set") {
            Describe(rule, options);
            rule.enable = (old == nullptr || old->enable) && !options.isDisabled;
        } else {
            rule.enable = options.action == "enable";
        }
        Write(path, rule);
    }
}

int Run(const Options &options, const std::string &root) {
    const std::string path = root + "/etc/kelosyslog/notify.conf";
    const bool isDescription = options.action == "add" || options.action == "set";
    const bool isTest = options.action == "test";
    if (!isDescription && (IsGiven(options.keyword) || options.isDisabled))
        throw UsageError("--keyword, --disabled: go with add and set only");
    if (!isDescription && !isTest && (IsGiven(options.severity) || IsGiven(options.eps)))
        throw UsageError("--severity, --eps: go with add, set and test only");
    if (options.action == "list" || isTest) {
        if (!options.names.empty())
            throw UsageError("rules " + options.action + ": takes no names");
        if (!isTest)
            return PrintRules(LoadRules(path), path, options.test.format);
        RuleTestOptions test = options.test;
        test.hasSeverity = IsGiven(options.severity);
        if (test.hasSeverity)
            test.severity = ParseSeverity(options.severity);
        test.hasEps = IsGiven(options.eps);
        if (test.hasEps)
            test.eps = ParseNumber("--eps", options.eps, 0, UINT64_MAX);
        return TestRules(test, path, root);
    }
    constexpr std::string_view kChanges[] = {"add", "set", "enable", "disable", "remove"};
    if (std::find(std::begin(kChanges), std::end(kChanges), options.action) == std::end(kChanges))
        throw UsageError("rules: no action '" + options.action +
                         "'; actions are list, add, set, enable, disable, remove, test");
    if (options.names.empty() || (isDescription && options.names.size() > 1))
        throw UsageError("rules " + options.action + ": needs the name of a rule");
    Change(path, options);
    TellReceiver(root, "the rules from before");
    return kExitFound;
}

} // namespace

void AddRules(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "rules", "Show, change and test the notification rules",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    OfferWords(
        command.AddText("action", options->action, "", "list, add, set, enable, disable, remove or test"),
        {"list", "add", "set", "enable", "disable", "remove", "test"})
        .Required();
    command.AddTexts("names", options->names, "", "Names of rules").AnyNumber();
    OfferWords(command.AddText("--severity", options->severity, "LEVEL",
                               "This severity and all that are more severe"),
               SeverityNames());
    command.AddText("--eps", options->eps, "N", "N logs or more in one second, up to 2147483647");
    command.AddText("--keyword", options->keyword, "TEXT", "Messages that hold this text, byte for byte");
    command.AddFlag("--disabled", options->isDisabled, "The rule is off");
    command.AddText("--text", options->test.text, "TEXT", "Test this message");
    command.AddText("-n,--lines", options->test.lines, "N", "Test the newest N stored logs (100)");
    command.AddFlag("--notify", options->test.mustNotify,
                    "Send the notifications of the logs that are tested");
    OfferWords(command.AddText("-o,--output", options->test.format, "FORMAT", "text (default) or json"),
               {"text", "json"});
    AddTableOptions(command, options->test.table, false);
}

} // namespace kelo::tool
