// kelosyslog archive: copies a log database into an archive, and maintains the archives.

#include <csignal>
#include <ctime>
#include <exception>
#include <filesystem>

#include "archive/archive_run.h"
#include "archive/database_copy.h"
#include "archive/retention.h"
#include "base/atomic_file.h"
#include "base/errors.h"
#include "base/stop_signals.h"
#include "cli/completion.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "print/action_lines.h"
#include "print/statistics_table.h"
#include "read/time_expression.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

constexpr const char *kFooter =
    "A run copies the logs while the server goes on writing, into a file named DEVICE_FIRST_LAST.db after "
    "the\n"
    "device and the days of its first and last log. With --keep and --keep-size it then removes the oldest\n"
    "archives, never the one just made. What removes something is asked for; without a terminal --yes is "
    "needed.\n\n"
    "Examples:\n"
    "  kelosyslog archive\n"
    "  kelosyslog archive --remove-archived --keep 365d --yes\n"
    "  kelosyslog archive --device nas1 --to /volume2/archive\n"
    "  kelosyslog archive --list\n"
    "  kelosyslog archive --prune --keep-size 10G --dry-run\n"
    "  kelosyslog search --log nas1_2020-01-01_2020-01-31 -g disk\n\n"
    "Exit status: 0 done, 1 nothing to do or not confirmed, 2 usage, 3 database, 4 folder or output.";

struct Options {
    LogTableOptions table;
    std::string to;
    std::string device;
    std::string keep;
    std::string keepSize;
    std::string format = "text";
    bool isRemoving = false;
    bool isPruning = false;
    bool isListing = false;
    bool isDryRun = false;
    bool isConfirmed = false;
    bool noHeader = false;
    bool inUtc = false;
};

// The path without links; unchanged if it cannot be resolved, so that opening it reports the reason.
std::string Canonical(const std::string &path) {
    std::error_code error;
    const fs::path canonical = fs::weakly_canonical(path, error);
    return error ? path : canonical.string();
}

// The command with its options and its folder.
class ArchiveCommand {
public:
    ArchiveCommand(const Options &options, const std::string &root)
        : options_(options), root_(root),
          folder_(options.to.empty() ? ArchiveFolderPath(root) : fs::absolute(options.to).string()),
          lines_(options.format == "json" ? OutputFormat::Json : OutputFormat::Text) {
        folder_ = Canonical(folder_);
        RequireSense();
        if (!options.keep.empty()) {
            const int64_t now = std::time(nullptr);
            retention_.since = ParseTimeExpression("--keep", options.keep, now).seconds;
            if (*retention_.since >= now)
                throw UsageError("--keep: '" + options.keep + "' is no age; write for example 90d");
        }
        if (!options.keepSize.empty())
            retention_.bytes = ParseSize("--keep-size", options.keepSize);
    }

    int List() {
        const OutputFormat format = ParseOutputFormat(options_.format);
        if (format == OutputFormat::Short)
            throw UsageError(
                "--output: archives have no form 'short'; forms are text, json, jsonl, csv, spreadsheet");
        const bool isText = format == OutputFormat::Text;
        const TimeFormat time(false);
        StatisticsTable table({{"name", false},
                               {"device", false},
                               {"first", false},
                               {"last", false},
                               {"logs", true},
                               {"size", true}});
        for (const Archive &archive : ListArchives(folder_))
            table.Add({archive.name, archive.device,
                       isText ? time.Plain(archive.first) : time.Iso(archive.first),
                       isText ? time.Plain(archive.last) : time.Iso(archive.last),
                       std::to_string(archive.logs), std::to_string(archive.bytes)});
        Output output(false);
        output.Write(table.Write(format, !options_.noHeader));
        output.Finish();
        return table.IsEmpty() ? kExitNothing : kExitFound;
    }

    int Prune() {
        const ArchiveFolder folder(folder_, options_.to.empty());
        const std::vector<Archive> expired = Expired(ListArchives(folder_), retention_);
        if (expired.empty()) {
            Print("no archive to remove in " + folder_);
            return Finish(kExitNothing);
        }
        const std::string action = "remove " + std::to_string(expired.size()) +
                                   (expired.size() == 1 ? " archive from " : " archives from ") + folder_;
        if (!MayRemove(action))
            return kExitNothing;
        RemoveExpired(expired);
        return Finish(kExitFound);
    }

    int Make(const LogTable &table) {
        if (options_.isDryRun)
            return Preview(table.path);
        ArchiveFolder folder(folder_, options_.to.empty());
        ArchiveRun run({table.path, options_.device, options_.isRemoving, root_}, folder,
                       [this](const std::string &line) { Print(line); });
        const bool hasDone = run.Run();
        retention_.spared = run.Made();
        RemoveExpired(Expired(ListArchives(folder_), retention_));
        return Finish(hasDone ? kExitFound : kExitNothing);
    }

    void RefuseArchive(const LogTable &table) const {
        if (fs::path(table.path).parent_path() == folder_)
            throw UsageError(table.path + " is in the folder of the archives already");
    }

    // Asks for confirmation if something will be removed.
    bool MayMake(const LogTable &table) const { return MayRemove(PlannedRemovals(table.path)); }

private:
    // Refuses an option that would silently do nothing.
    void RequireSense() const {
        const auto refuse = [](const char *option, bool isGiven, const char *mode) {
            if (isGiven)
                throw UsageError(std::string(option) + ": goes not together with " + mode);
        };
        const char *mode = options_.isListing ? "--list" : options_.isPruning ? "--prune" : nullptr;
        if (mode != nullptr) {
            refuse("--prune", options_.isListing && options_.isPruning, mode);
            refuse("--db", !options_.table.db.empty(), mode);
            refuse("--log", !options_.table.log.empty(), mode);
            refuse("--device", !options_.device.empty(), mode);
            refuse("--remove-archived", options_.isRemoving, mode);
        }
        const bool hasRetention = !options_.keep.empty() || !options_.keepSize.empty();
        refuse("--keep, --keep-size", options_.isListing && hasRetention, mode);
        if (options_.isPruning && !hasRetention)
            throw UsageError("--prune: needs --keep or --keep-size");
        if (!options_.isListing)
            ParseKeyValuesFormat(options_.format);
    }

    // A failed message must not prevent the rest of the work.
    void Print(const std::string &line) {
        try {
            lines_.Add(line);
        } catch (const std::exception &) {
            outputFailure_ = std::current_exception();
        }
    }

    int Finish(int status) const {
        if (outputFailure_)
            std::rethrow_exception(outputFailure_);
        lines_.End();
        return status;
    }

    bool MayRemove(const std::string &action) const {
        if (action.empty() || options_.isDryRun || options_.isConfirmed || Confirm("archive", action))
            return true;
        PrintMessage("nothing done");
        return false;
    }

    std::string PlannedRemovals(const std::string &source) const {
        std::string action;
        if (options_.isRemoving)
            action = "remove the logs from " + source + " once they are archived";
        if (retention_.since || retention_.bytes)
            action += (action.empty() ? "remove" : ", and") + std::string(" old archives from ") + folder_;
        return action;
    }

    int Preview(const std::string &source) {
        const uint64_t count = CountLogs(source, options_.device);
        Print("would archive " + LogsOf(count, options_.device) + " from " + source + " to " + folder_ +
              (options_.isRemoving ? ", and remove them from the database" : ""));
        RemoveExpired(Expired(ListArchives(folder_), retention_));
        return Finish(count > 0 ? kExitFound : kExitNothing);
    }

    void RemoveExpired(const std::vector<Archive> &expired) {
        for (const Archive &archive : expired) {
            const std::string path = folder_ + "/" + archive.name;
            if (!options_.isDryRun && !RemoveDurably(path))
                throw OutputError("cannot remove " + path);
            Print(std::string(options_.isDryRun ? "would remove " : "removed ") + path + " (" +
                  LogsOf(archive.logs, "") + " up to " + TimeFormat(false).Plain(archive.last) + ", " +
                  FormatSize(archive.bytes) + ")");
        }
    }

    const Options &options_;
    std::string root_;
    std::string folder_;
    Retention retention_;
    ActionLines lines_;
    std::exception_ptr outputFailure_;
};

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.inUtc);
    ArchiveCommand command(options, root);
    if (options.isListing)
        return command.List();
    if (options.isPruning)
        return command.Prune();
    LogTable table = ResolveLogTable(options.table, root);
    RequireDatabase(table.path, "archive");
    table.path = Canonical(table.path); // one name for the note of a removal
    if (table.kind != TableKind::Logs)
        throw UsageError("--log: only logs in table logs can be archived, not '" + options.table.log + "'");
    command.RefuseArchive(table);
    if (!command.MayMake(table))
        return kExitNothing;
    try {
        const StopSignals signals;
        return command.Make(table);
    } catch (const Interrupted &interruption) {
        // Ends the process with the signal.
        std::raise(interruption.signal);
        return kExitSystem;
    }
}

} // namespace

void AddArchive(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "archive", "Copy logs into an archive, and keep the archives",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    command.AddText("--to", options->to, "FOLDER",
                    "Folder of the archives, which must be there (default: /var/log/kelosyslog/archive)");
    command.AddText("--device", options->device, "HOST", "Only the logs of this host (default: all)");
    command.AddFlag("--remove-archived", options->isRemoving,
                    "Remove the archived logs from the database, once the archive is complete");
    command.AddText("--keep", options->keep, "AGE",
                    "Remove archives whose last log is older, for example 90d");
    command.AddText("--keep-size", options->keepSize, "SIZE",
                    "Remove the oldest archives until all take no more than this, for example 10G");
    command.AddFlag("--prune", options->isPruning, "Archive nothing, only remove old archives");
    command.AddFlag("--list", options->isListing, "List the archives, oldest first");
    command.AddFlag("--dry-run", options->isDryRun, "Only tell what would be archived and removed");
    command.AddFlag("-y,--yes", options->isConfirmed, "Do not ask");
    OfferWords(command.AddText("-o,--output", options->format, "FORMAT",
                               "text (default) or json; with --list also jsonl (an object per line), csv, "
                               "spreadsheet (csv without formulas)"),
               {"text", "json", "jsonl", "csv", "spreadsheet"});
    command.AddFlag("--no-header", options->noHeader, "--list: no heading in text and csv");
    AddUtcOption(command, options->inUtc);
    AddTableOptions(command, options->table, false);
}

} // namespace kelo::tool
