// kelosyslog notify: shows and tests the channels of notifications, and the spool.

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <memory>

#include "base/errors.h"
#include "base/files.h"
#include "base/json.h"
#include "base/text_encoding.h"
#include "base/time_format.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "cli/program.h"
#include "commands/commands.h"
#include "commands/rule_set.h"
#include "keloplatform/kelonotify.h"
#include "keloplatform/torvc.h"
#include "print/output.h"
#include "spool/channel_health.h"
#include "spool/settings.h"
#include "spool/spool.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "Actions:\n"
    "  status          Print the channels and whether they work, and how many notifications wait\n"
    "  test CHANNEL    Send a test notification through mail, sms, push_mobile, push_msn, push_skype or "
    "desktop\n"
    "  test TAG        Send the notification of this tag, without values, through its channels\n"
    "  list            Print the notifications that wait, and those that were given up\n"
    "  retry [ID...]   Try to deliver now what waits; given ids, or with --all all, are taken up again\n\n"
    "kelonotify(8) delivers.\n\n"
    "Exit status: 0 done or found, 1 nothing, 2 usage, 3 file, 4 output.";

constexpr const char *kTestTag = "KELOSYSLOG_TEST";

struct Options {
    std::string action;
    std::vector<std::string> names;
    bool isAll = false;
    std::string format = "text";
};

struct HashFreer {
    void operator()(TORVSZHASH *hash) const { TORVCSzHashFree(hash); }
};

int Print(const Json::Value &items, bool isJson, const std::string &text) {
    Output output(true);
    output.Write(isJson ? WriteJsonLine(items) : text);
    output.Finish();
    return items.empty() ? kExitNothing : kExitFound;
}

int ShowStatus(const Spool &spool, const Settings &settings, bool isJson) {
    Json::Value status;
    std::string text;
    for (const ChannelHealth &health : ReadChannelHealth(spool, settings)) {
        std::string problem = health.problem;
        if (health.next != 0)
            problem += " (next attempt " + TimeFormat(false).Plain(health.next) + ")";
        Json::Value &channel = status["channels"][health.name];
        channel["enabled"] = health.isOn;
        channel["problem"] = problem;
        text += health.name + std::string(13 - health.name.size(), ' ') +
                (!health.isOn      ? "off"
                 : problem.empty() ? "on"
                                   : "failing: ") +
                EscapeForTerminal(problem) + "\n";
    }
    const size_t waiting = spool.NewIds().size();
    const size_t failed = spool.FailedIds().size();
    status["waiting"] = static_cast<Json::UInt64>(waiting);
    status["failed"] = static_cast<Json::UInt64>(failed);
    text += std::to_string(waiting) + " waiting, " + std::to_string(failed) + " given up\n";
    if (settings.IsOpenToOthers())
        PrintMessage(settings.Path() + " holds passwords and may be read by everybody: give it mode 0640");
    return Print(status, isJson, text);
}

Json::Value Describe(const Spool &spool, const std::string &id, bool isFailed, std::string &text) {
    Json::Value item;
    item["id"] = id;
    item["state"] = isFailed ? "failed" : "waiting";
    const Progress progress = isFailed ? spool.ReadFailedProgress(id) : spool.ReadProgress(id);
    std::string reason = progress.reason;
    item["delivered"] = Json::arrayValue;
    for (const auto &[target, attempts] : progress.targets) {
        if (attempts.isDone)
            item["delivered"].append(target);
        else if (!attempts.reason.empty())
            reason += (reason.empty() ? "" : "; ") + target + ": " + attempts.reason;
    }
    item["reason"] = reason;
    text += id + (isFailed ? "  given up  " : "  waiting   ");
    try {
        const Entry entry = isFailed ? spool.ReadFailed(id) : spool.ReadNew(id);
        item["time"] = static_cast<Json::Int64>(entry.time);
        item["tag"] = entry.tag;
        item["title"] = entry.title;
        text += TimeFormat(false).Plain(entry.time) + "  " + EscapeForTerminal(entry.title);
    } catch (const SpoolError &) {
        throw;
    } catch (const std::runtime_error &error) { // delivered meanwhile, or damaged
        item["problem"] = error.what();
        text += EscapeForTerminal(error.what());
    }
    text += (reason.empty() ? "" : "\n    " + EscapeForTerminal(reason)) + "\n";
    return item;
}

int List(const Spool &spool, bool isJson) {
    Json::Value items(Json::arrayValue);
    std::string text;
    for (const bool isFailed : {false, true}) {
        for (const std::string &id : isFailed ? spool.FailedIds() : spool.NewIds())
            items.append(Describe(spool, id, isFailed, text));
    }
    return Print(items, isJson, text);
}

int Retry(const Spool &spool, const Options &options) {
    const std::vector<std::string> ids = options.isAll ? spool.FailedIds() : options.names;
    spool.CreateFolders();
    for (const std::string &id : ids) {
        if (!spool.Retry(id, std::time(nullptr)))
            throw UsageError("notify retry: no notification '" + id + "' was given up");
    }
    spool.RequestRetry();
    return kExitFound;
}

void Send(const std::string &tag, const std::string &root, const std::string &filter) {
    constexpr size_t kRoom = 8;
    const std::unique_ptr<TORVSZHASH, HashFreer> owned(TORVCSzHashAlloc(kRoom));
    TORVSZHASH *values = owned.get();
    const std::string texts = root + "/usr/kelo/keloman/webman/modules/Quillbay/texts/";
    if (KELOSysNotifySendNotificationCustomized(tag.c_str(), texts.c_str(), filter.c_str(), &values, 0) < 0)
        throw DatabaseError("the notification cannot be stored in the spool: " +
                            std::string(std::strerror(errno)));
}

int Test(const Settings &settings, const std::string &name, const std::string &root) {
    const bool isChannel =
        std::find(std::begin(kChannelNames), std::end(kChannelNames), name) != std::end(kChannelNames);
    if (!isChannel && !name.starts_with("KELOSYSLOG_"))
        throw UsageError("notify test: '" + name + "' is neither a channel nor a tag (see --help)");
    if (isChannel && !settings.IsOn(name))
        throw UsageError("notify test: channel " + name + " is off in " + settings.Path());
    if (const std::string problem = isChannel ? ChannelProblem(settings, name) : ""; !problem.empty())
        throw UsageError("notify test: " + problem);
    if (!isChannel) {
        Send(name, root, root + "/etc/kelosyslog/notify.filter");
        return kExitFound;
    }
    const TemporaryFile filter("/tmp/kelosyslog.XXXXXX", std::string(kTestTag) + "=\"" + name + "\"\n");
    if (!filter.IsWritten())
        throw OutputError(filter.Path() + ": " + std::strerror(errno));
    Send(kTestTag, root, filter.Path());
    return kExitFound;
}

int Run(const Options &options, const std::string &root) try {
    const Spool spool(root);
    const Settings settings(root);
    const bool isJson = IsJson(options.format);
    const bool isTest = options.action == "test";
    const bool isRetry = options.action == "retry";
    if (isTest ? options.names.size() != 1 : !isRetry && !options.names.empty())
        throw UsageError("notify " + options.action +
                         (isTest ? ": needs a channel or a tag" : ": takes no names"));
    if (options.isAll && (!isRetry || !options.names.empty()))
        throw UsageError("--all: goes with 'retry' alone");
    if (options.action == "status")
        return ShowStatus(spool, settings, isJson);
    if (options.action == "list")
        return List(spool, isJson);
    if (isRetry)
        return Retry(spool, options);
    if (isTest)
        return Test(settings, options.names.front(), root);
    throw UsageError("notify: no action '" + options.action + "'; actions are status, test, list, retry");
} catch (const SpoolError &error) {
    throw DatabaseError(error.what());
}

} // namespace

void AddNotify(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "notify", "Show and test how notifications go",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    OfferWords(command.AddText("action", options->action, "", "status, test, list or retry"),
               {"status", "test", "list", "retry"})
        .Required();
    OfferWords(command.AddTexts("names", options->names, "", "A channel or a tag, or ids"),
               {std::begin(kChannelNames), std::end(kChannelNames)}, "test")
        .AnyNumber();
    command.AddFlag("--all", options->isAll, "Take up again everything that was given up");
    OfferWords(command.AddText("-o,--output", options->format, "FORMAT", "text (default) or json"),
               {"text", "json"});
}

} // namespace kelo::tool
