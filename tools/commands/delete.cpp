// kelosyslog delete: removes records.

#include <algorithm>
#include <chrono>
#include <csignal>
#include <ctime>

#include "base/errors.h"
#include "base/stop_signals.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "cli/progress_bar.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "keloplatform/cluster.h"
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

// The approximate time for which one statement may keep other writers waiting.
constexpr std::chrono::milliseconds kStepTime{100};
constexpr uint64_t kSmallestStep = 50;
constexpr uint64_t kLargestStep = 5000; // records

struct Options {
    LogTableOptions table;
    LogFilter filter;
    std::string format = "text";
    bool inUtc = false;
    bool all = false;
    bool isConfirmed = false;
    bool isDryRun = false;
};

std::string Logs(uint64_t count) {
    return std::to_string(count) + (count == 1 ? " matching log" : " matching logs");
}

// The condition that a record has one of these ids: for any filter SQLite then finds the rows directly, and
// holds the write lock only while it removes them.
_SYSLOG_SQL_COND_tag HasId(const std::vector<uint64_t> &ids, size_t first, size_t count) {
    std::string list;
    for (size_t i = first; i < first + count; ++i)
        list += (i == first ? "" : ",") + std::to_string(ids[i]);
    return {SYSLOG_ATTRI_MSG, SYSLOG_OP_RAW, "id IN (" + list + ")", {}};
}

// Deletes records in steps, so that others write in between.
class Deletion {
public:
    Deletion(const LogTable &table, uint64_t total)
        : table_(table), total_(total), progress_(total, ProgressBar::Unit::Records) {}

    // Throws DatabaseError and Interrupted with the number of records that were deleted before.
    void Delete(const std::vector<uint64_t> &ids) {
        for (size_t next = 0; next < ids.size();) {
            if (StopSignals::Received() != 0) {
                progress_.Clear();
                PrintMessage("interrupted; " + Deleted() + " were deleted");
                StopSignals::Check();
            }
            const size_t count = std::min<size_t>(step_, ids.size() - next);
            const auto begin = std::chrono::steady_clock::now();
            if (SyslogDBDelete(table_.path, {HasId(ids, next, count)}) != 0) {
                progress_.Clear();
                throw DatabaseError(DescribeDatabaseProblem(table_, true) +
                                    (deleted_ > 0 ? "; " + Deleted() + " were deleted before" : ""));
            }
            Adapt(std::chrono::steady_clock::now() - begin);
            next += count;
            deleted_ += count;
            progress_.Add(count);
        }
    }

    uint64_t Count() const { return deleted_; }

private:
    std::string Deleted() const { return std::to_string(deleted_) + " of " + Logs(total_); }

    void Adapt(std::chrono::steady_clock::duration taken) {
        if (taken > kStepTime)
            step_ = std::max(step_ / 2, kSmallestStep);
        else if (taken < kStepTime / 2)
            step_ = std::min(step_ * 2, kLargestStep);
    }

    const LogTable &table_;
    uint64_t total_;
    ProgressBar progress_;
    uint64_t deleted_ = 0;
    uint64_t step_ = 500;
};

// On a cluster in one statement: it deletes at the cost of a part of the table, however many rows there are,
// and keeps nobody waiting.
void DeleteOnCluster(const LogReader &reader, uint64_t newest) {
    std::list<_SYSLOG_SQL_COND_tag> conditions = reader.Selected();
    AddRange(conditions, {1, newest});
    if (SyslogDBDelete(reader.Table().path, conditions) != 0)
        throw DatabaseError(DescribeDatabaseProblem(reader.Table(), true));
}

// Deletes the selected records up to `newest`. Returns how many.
uint64_t DeleteUpTo(const LogReader &reader, uint64_t newest, uint64_t total) {
    const StopSignals signals;
    Deletion deletion(reader.Table(), total);
    std::vector<uint64_t> ids;
    reader.Scan(
        {1, newest}, true, 0, [&](const _SYSLOG_LOG_DATA_tag &log) { ids.push_back(log.id); },
        [&] {
            deletion.Delete(ids);
            ids.clear();
        });
    return deletion.Count();
}

// "deleted 5 matching logs from ..."
void PrintResult(const Options &options, const LogTable &table, uint64_t count, OutputFormat format) {
    Output output(false);
    if (format == OutputFormat::Text) {
        output.Write((options.isDryRun ? "would delete " : "deleted ") + Logs(count) + " from " + table.path +
                     "\n");
    } else {
        KeyValues values;
        values.Add("path", table.path);
        values.Add(options.isDryRun ? "matching" : "deleted", static_cast<int64_t>(count));
        output.Write(values.Render(format));
    }
    output.Finish();
}

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.inUtc);
    const OutputFormat format = ParseKeyValuesFormat(options.format);
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
    if (options.isDryRun || count == 0) {
        PrintResult(options, table, count, format);
        return count > 0 ? kExitFound : kExitNothing;
    }
    if (!options.isConfirmed && !Confirm("delete", "delete " + what)) {
        PrintMessage("nothing deleted");
        return kExitNothing;
    }
    int stopSignal = 0;
    try {
        uint64_t deleted = count;
        if (KELODBIsCluster(table.path.c_str()) != 0)
            DeleteOnCluster(reader, newest);
        else
            deleted = DeleteUpTo(reader, newest, count);
        PrintResult(options, table, deleted, format);
    } catch (const Interrupted &interruption) {
        stopSignal = interruption.signal;
    }
    if (stopSignal != 0)
        std::raise(stopSignal); // the parent process sees the signal
    return kExitFound;
}

} // namespace

void AddDelete(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "delete", "Delete logs from table logs",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    AddFilterOptions(command, options->filter);
    command.AddFlag("--all", options->all, "Delete all logs");
    command.AddFlag("-y,--yes", options->isConfirmed, "Do not ask");
    command.AddFlag("--dry-run", options->isDryRun, "Only tell how many logs match");
    AddUtcOption(command, options->inUtc);
    AddKeyValuesFormat(command, options->format);
    AddTableOptions(command, options->table, false);
}

} // namespace kelo::tool
