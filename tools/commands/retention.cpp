// kelosyslog retention: removes records of the working log that are too old or too many, and keeps its volume
// from filling.

#include <syslog.h>

#include <csignal>
#include <filesystem>

#include "base/errors.h"
#include "base/stop_signals.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "print/action_lines.h"
#include "read/log_table.h"
#include "retention/retention_run.h"
#include "retention/retention_state.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "The rule is in /etc/kelosyslog/retention.conf, and kelosyslog-retention.timer follows it every minute.\n"
    "Without the file nothing is removed. Its lines:\n"
    "  keep=\"90d\"             remove records that are older\n"
    "  keep_size=\"20G\"        remove the oldest records while the log has more\n"
    "  min_free=\"5%\"          when the volume has less free (or a size),\n"
    "  when_full=\"remove\"     remove the oldest records, or \"stop\" receiving until there is room\n\n"
    "Examples:\n"
    "  kelosyslog retention --dry-run\n"
    "  kelosyslog retention --yes\n\n"
    "Exit status: 0 done or to be done, 1 nothing to do or not confirmed, 2 usage, 3 the rule is refused or "
    "a database, 4 output.";

struct Options {
    std::string format = "text";
    bool isDryRun = false;
    bool isConfirmed = false;
};

// Calls `follow`, and notes in the state of the retention why it fails. The timer would repeat it every
// minute, so the system log gets a reason once.
int NoteProblem(const std::string &root, const std::function<int()> &follow) {
    const auto note = [&root](const std::string &problem) {
        RetentionState state = ReadRetentionState(root);
        if (state.problem == problem)
            return;
        state.problem = problem;
        WriteRetentionState(root, state);
        if (!problem.empty())
            syslog(LOG_ERR, "the rule of retention is not followed: %s", problem.c_str());
    };
    try {
        const int status = follow();
        note("");
        return status;
    } catch (const DatabaseError &error) {
        note(error.what());
        throw;
    } catch (const OutputError &error) {
        note(error.what());
        throw;
    }
}

int Follow(const Options &options, const std::string &root, ActionLines &lines) {
    const auto print = [&lines](const std::string &line) { lines.Add(line); };
    const std::string path = ResolveLogTable({}, root).path;
    const VolumeStatus volume = VolumeOf(root, std::filesystem::path(path).parent_path().string());
    const std::optional<RetentionRule> rule = LoadRetentionRule(root, volume);
    if (!rule || !std::filesystem::exists(path)) {
        print(rule ? "no working log " + path : "no rule in " + RetentionFilePath(root) + ": records stay");
        return kExitNothing;
    }
    RetentionRun run(root, *rule, volume, options.isDryRun, print);
    if (options.isDryRun || !options.isConfirmed) {
        const std::vector<std::string> plan = run.Plan();
        print("rule: " + DescribeRetention(*rule));
        for (const std::string &line : plan)
            print("would " + line);
        if (plan.empty() || options.isDryRun)
            return plan.empty() ? kExitNothing : kExitFound;
        if (!Confirm("retention", "do so")) {
            PrintMessage("nothing done");
            return kExitNothing;
        }
    }
    return run.Execute() ? kExitFound : kExitNothing;
}

int Run(const Options &options, const std::string &root) {
    openlog("kelosyslog", LOG_PID, LOG_DAEMON);
    const OutputFormat format = ParseKeyValuesFormat(options.format);
    const auto follow = [&] {
        ActionLines lines(format);
        const int status = Follow(options, root, lines);
        lines.End();
        return status;
    };
    try {
        const StopSignals signals;
        return options.isDryRun ? follow() : NoteProblem(root, follow);
    } catch (const Interrupted &interruption) {
        std::raise(interruption.signal); // what was removed is committed
        return kExitSystem;
    }
}

} // namespace

void AddRetention(Program &program) {
    auto options = std::make_shared<Options>();
    Command command =
        AddSubcommand(program, "retention", "Remove records of the working log by their age and its size",
                      [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    command.AddFlag("--dry-run", options->isDryRun, "Only tell what would be done");
    command.AddFlag("-y,--yes", options->isConfirmed, "Do not ask");
    AddKeyValuesFormat(command, options->format);
}

} // namespace kelo::tool
