// kelosyslog delete: removes logs.

#include <unistd.h>

#include <algorithm>
#include <ctime>
#include <iostream>

#include "common_options.h"
#include "errors.h"
#include "exit_status.h"
#include "log_reader.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "The number of matching logs is shown and a confirmation asked for; without a terminal --yes is needed.\n"
    "Logs that arrive in the meantime stay. The logs go in small steps, so that others can write in "
    "between.\n\n"
    "Examples:\n"
    "  kelosyslog delete --until '30 days ago' --dry-run\n"
    "  kelosyslog delete -p debug..debug -H 'test*' --yes\n"
    "  kelosyslog delete --all --db /volume1/old.db\n\n"
    "Exit status: 0 deleted, 1 nothing matched or not confirmed, 2 usage, 3 database.";

// Ids that one statement covers: about 40 ms, for which other writers wait.
constexpr uint64_t kStepIds = 10000;

struct Options {
    LogSourceOptions source;
    Selection selection;
    bool inUtc = false;
    bool all = false;
    bool isConfirmed = false;
    bool isDryRun = false;
};

std::string Logs(uint64_t count) {
    return std::to_string(count) + (count == 1 ? " matching log" : " matching logs");
}

bool Confirm(const std::string &question) {
    if (isatty(STDIN_FILENO) == 0)
        throw UsageError("delete: no terminal to ask on; add --yes to delete " + question);
    std::cerr << "Delete " << question << "? [y/N] " << std::flush;
    std::string answer;
    std::getline(std::cin, answer);
    return answer == "y" || answer == "Y" || answer == "yes";
}

// Deletes what is selected up to `lastId`, hopping from one selected log to the next, so that neither gaps
// between the ids nor rare matches make it slow.
void DeleteUpTo(const LogReader &reader, const Conditions &conditions, uint64_t lastId) {
    const LogSource &source = reader.Source();
    uint64_t next = 1;
    bool isBegun = false;
    while (next <= lastId) {
        const uint64_t first = reader.FirstId({next, lastId});
        if (first == 0)
            return;
        const uint64_t last = std::min(first + kStepIds - 1, lastId);
        Conditions step = conditions;
        step.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_GE, std::to_string(first), {}});
        step.push_back({SYSLOG_ATTRI_ID, SYSLOG_OP_LE, std::to_string(last), {}});
        if (SyslogDBDelete(source.path, step) != 0)
            throw DatabaseError(
                DescribeDatabaseProblem(source, true) +
                (isBegun ? "; matching logs before id " + std::to_string(first) + " are deleted" : ""));
        isBegun = true;
        next = last + 1;
    }
}

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.inUtc);
    if (IsEmpty(options.selection) && !options.all)
        throw UsageError("delete: nothing selects the logs to delete; use --all for all of them");
    if (!IsEmpty(options.selection) && options.all)
        throw UsageError("--all: goes with no option that selects logs");
    const LogSource source = ResolveLogSource(options.source, root);
    if (source.kind != TableKind::Logs)
        throw UsageError("--log: logs can be deleted from table logs only, not from '" + options.source.log +
                         "'");
    const Conditions conditions = MakeConditions(options.selection, source, std::time(nullptr));
    const LogReader reader(source, conditions);

    const uint64_t newest = reader.IdFromNewest(0);
    const uint64_t count = newest == 0 ? 0 : reader.Count();
    const std::string what = Logs(count) + " from " + source.path;
    Output output(false);
    if (options.isDryRun || count == 0) {
        output.Write((options.isDryRun ? "would delete " : "deleted ") + what + "\n");
        output.Finish();
        return count > 0 ? kExitFound : kExitNothing;
    }
    if (!options.isConfirmed && !Confirm(what)) {
        PrintMessage("nothing deleted");
        return kExitNothing;
    }
    DeleteUpTo(reader, conditions, newest);
    output.Write("deleted " + what + "\n");
    output.Finish();
    return kExitFound;
}

} // namespace

void AddDelete(Program &program) {
    auto options = std::make_shared<Options>();
    CLI::App *command = AddSubcommand(program, "delete", "Delete logs from table logs",
                                      [options, &program] { return Run(*options, program.root); });
    command->footer(kFooter);
    AddSelectionOptions(*command, options->selection);
    command->add_flag("--all", options->all, "Delete all logs");
    command->add_flag("-y,--yes", options->isConfirmed, "Do not ask");
    command->add_flag("--dry-run", options->isDryRun, "Only tell how many logs match");
    AddUtcOption(*command, options->inUtc);
    AddSourceOptions(*command, options->source, false);
}

} // namespace kelo::tool
