#include "archive/archive_run.h"

#include <unistd.h>

#include <climits>
#include <filesystem>
#include <utility>

#include "archive/database_copy.h"
#include "archive/removal.h"
#include "archive/retention.h"
#include "base/stop_signals.h"
#include "base/text_encoding.h"
#include "cli/program.h"
#include "cli/progress_bar.h"
#include "read/event_log.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

std::string NameOfThisMachine() {
    char name[HOST_NAME_MAX + 1] = {};
    gethostname(name, sizeof name - 1);
    return name;
}

} // namespace

std::string LogsOf(uint64_t count, const std::string &host) {
    return std::to_string(count) + (count == 1 ? " log" : " logs") +
           (host.empty() ? "" : " of " + EscapeForTerminal(host));
}

ArchiveRun::ArchiveRun(Order order, ArchiveFolder &folder, std::function<void(const std::string &)> report)
    : order_(std::move(order)), folder_(folder), report_(std::move(report)) {}

bool ArchiveRun::Run() {
    const bool hasResumed = order_.isRemoving && ResumeRemovals();
    const bool isMade = Archive();
    if (isMade && order_.isRemoving)
        RemoveArchived(made_);
    return hasResumed || isMade;
}

// Returns whether there was something to archive.
bool ArchiveRun::Archive() {
    try {
        if (CountLogs(order_.source, order_.host) == 0) {
            PrintMessage("nothing archived: " + order_.source + " holds " + LogsOf(0, order_.host));
            return false;
        }
        Record(&Logger::LogAddArchStart);
        Copy();
    } catch (const std::exception &) {
        Record(&Logger::LogAddArchFailed);
        if (StopSignals::Received() != 0)
            PrintMessage("interrupted; nothing archived");
        throw;
    }
    Record(&Logger::LogAddArchFinish);
    return true;
}

// A failed event must not prevent the archive.
void ArchiveRun::Record(int (Logger::*add)(std::string) const) const {
    const std::string reason =
        AddEvent(order_.root, [&](Logger &logger) { return (logger.*add)(order_.source); });
    if (!reason.empty())
        PrintMessage("warning: the server's event log does not record this: " + reason);
}

void ArchiveRun::Copy() {
    std::error_code unknown;
    ProgressBar bar(fs::file_size(order_.source, unknown));
    CopyOrder copy{order_.source, order_.host, order_.host.empty() ? NameOfThisMachine() : order_.host};
    copy.onCopied = [&bar](uint64_t bytes) { bar.Add(bytes); };
    const DatabaseCopy archive = MakeArchive(copy, folder_, order_.isRemoving);
    bar.Clear();
    made_ = fs::path(archive.path).filename().string();
    report_("archived " + LogsOf(archive.logs, order_.host) + " from " + order_.source + " to " +
            archive.path + " (" + FormatSize(fs::file_size(archive.path, unknown)) + ")");
}

// Removes records that earlier runs archived and did not remove. Returns whether there were any.
bool ArchiveRun::ResumeRemovals() {
    uint64_t removed = 0;
    for (const std::string &name : folder_.PendingRemovals(order_.source))
        removed += RemoveArchived(name);
    return removed > 0;
}

uint64_t ArchiveRun::RemoveArchived(const std::string &name) {
    Removal removal(order_.source, folder_.Path() + "/" + name);
    try {
        removal.Run();
    } catch (const Interrupted &) {
        PrintMessage("interrupted; " + LogsOf(removal.Removed(), "") + " of " + name + " were removed from " +
                     order_.source + ", the next run with --remove-archived removes the others");
        throw;
    }
    folder_.ForgetRemoval(name);
    report_("removed " + LogsOf(removal.Removed(), "") + " from " + order_.source + ", which " + name +
            " holds");
    return removal.Removed();
}

} // namespace kelo::tool
