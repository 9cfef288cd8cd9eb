// kelosyslog delete: removes logs.

#include <algorithm>
#include <ctime>

#include "base/errors.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "read/log_reader.h"

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
    LogTableOptions table;
    LogFilter filter;
    bool inUtc = false;
    bool all = false;
    bool isConfirmed = false;
    bool isDryRun = false;
};

std::string Logs(uint64_t count) {
    return std::to_string(count) + (count == 1 ? " matching log" : " matching logs");
}

// Deletes what is selected up to `lastId`, range by range, hopping over ranges without a match. Returns how
// many logs matched right before each step.
uint64_t DeleteUpTo(const LogReader &reader, uint64_t lastId) {
    const std::string &path = reader.Table().path;
    uint64_t deleted = 0;
    uint64_t next = reader.FirstId({1, lastId});
    while (next != 0 && next <= lastId) {
        const IdRange step{next, std::min(next + kStepIds - 1, lastId)};
        const uint64_t count = reader.CountIn(step);
        Conditions conditions = reader.Selected();
        AddRange(conditions, step);
        if (count > 0 && SyslogDBDelete(path, conditions) != 0)
            throw DatabaseError(DescribeDatabaseProblem(reader.Table(), true) +
                                (deleted > 0 ? "; " + Logs(deleted) + " were deleted before" : ""));
        deleted += count;
        next = count > 0 ? step.last + 1 : reader.FirstId({step.last + 1, lastId});
    }
    return deleted;
}

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.inUtc);
    if (IsEmpty(options.filter) && !options.all)
        throw UsageError("delete: nothing selects the logs to delete; use --all for all of them");
    if (!IsEmpty(options.filter) && options.all)
        throw UsageError("--all: goes with no option that selects logs");
    const LogTable table = ResolveLogTable(options.table, root);
    if (table.kind != TableKind::Logs)
        throw UsageError("--log: logs can be deleted from table logs only, not from '" + options.table.log +
                         "'");
    const LogReader reader(table, MakeConditions(options.filter, table, std::time(nullptr)));

    const uint64_t newest = reader.IdFromNewest(0);
    const uint64_t count = newest == 0 ? 0 : reader.Count();
    const std::string what = Logs(count) + " from " + table.path;
    Output output(false);
    if (options.isDryRun || count == 0) {
        output.Write((options.isDryRun ? "would delete " : "deleted ") + what + "\n");
        output.Finish();
        return count > 0 ? kExitFound : kExitNothing;
    }
    if (!options.isConfirmed && !Confirm("delete", "delete " + what)) {
        PrintMessage("nothing deleted");
        return kExitNothing;
    }
    const uint64_t deleted = DeleteUpTo(reader, newest);
    output.Write("deleted " + Logs(deleted) + " from " + table.path + "\n");
    output.Finish();
    return kExitFound;
}

} // namespace

void AddDelete(Program &program) {
    auto options = std::make_shared<Options>();
    CLI::App *command = AddSubcommand(program, "delete", "Delete logs from table logs",
                                      [options, &program] { return Run(*options, program.root); });
    command->footer(kFooter);
    AddFilterOptions(*command, options->filter);
    command->add_flag("--all", options->all, "Delete all logs");
    command->add_flag("-y,--yes", options->isConfirmed, "Do not ask");
    command->add_flag("--dry-run", options->isDryRun, "Only tell how many logs match");
    AddUtcOption(*command, options->inUtc);
    AddTableOptions(*command, options->table, false);
}

} // namespace kelo::tool
