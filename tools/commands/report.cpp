// kelosyslog report: a page about the records and events of a period.

#include <unistd.h>

#include <ctime>

#include "base/atomic_file.h"
#include "base/errors.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "read/accounting_samples.h"
#include "read/eps_series.h"
#include "read/time_expression.h"
#include "report/report_page.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "The page needs no network and no other file. Without --since and --until it covers all logs of the "
    "database.\n\n"
    "Examples:\n"
    "  kelosyslog report today.html --since today\n"
    "  kelosyslog report week.html --since 1w --events 500\n"
    "  kelosyslog report old.html --db /volume1/archive.db\n\n"
    "Exit status: 0 written, 2 usage, 3 database, 4 the file cannot be written.";

constexpr size_t kTopDevices = 10;
constexpr uint64_t kMaxEvents = 100000;

struct Options {
    LogTableOptions table;
    LogFilter filter;
    std::string eventsDb;
    std::string events = "100";
    std::string target;
    bool inUtc = false;
};

// The figures as far as they can be read: a report is useful without them.
AccountingFigures ReadAccounting(const std::string &path, const Period &period, const TimeGrid &grid) {
    AccountingFigures figures;
    if (access(path.c_str(), F_OK) != 0)
        return figures;
    try {
        ReadEps(path, period.from, period.to, [&](const SYSLOG_LOG_EPS &sample) {
            figures.peaks.resize(grid.count);
            if (const std::optional<size_t> span = grid.Find(sample.stamp))
                figures.peaks[*span] = std::max(figures.peaks[*span], sample.eps);
        });
        RequireHistogram(path);
        figures.devices = SyslogDBHistGet(path, kTopDevices);
    } catch (const DatabaseError &error) {
        PrintMessage(std::string("no counts of the accounting: ") + error.what());
    }
    return figures;
}

// None without an event database, which a machine that only stores archives does not have.
std::optional<std::list<Event>> ReadEventsOf(const std::string &path, bool isNamed, const Period &period) {
    if (!isNamed && access(path.c_str(), F_OK) != 0)
        return std::nullopt;
    std::list<Event> events = ReadEvents(path);
    events.remove_if([&](const Event &event) { return event.time < period.from || event.time > period.to; });
    return events;
}

void ReadReport(const Options &options, const std::string &root, Report &report) {
    const LogTable table = ResolveLogTable(options.table, root);
    if (table.kind != TableKind::Logs)
        throw UsageError("--log: reports are about table logs only, not about '" + options.table.log + "'");
    std::optional<int64_t> since;
    if (!options.filter.since.empty())
        since = ParseTimeExpression("--since", options.filter.since, report.now).seconds;
    const std::optional<int64_t> until = LastSecond(options.filter, report.now);
    if (since.value_or(0) > until.value_or(since.value_or(0)))
        throw UsageError("--until: '" + options.filter.until + "' is before --since");

    report.logDatabase = table.path;
    const std::optional<Period> period = LogPeriod(table, since, until);
    const bool isWhole = !since && !until;
    report.period = period.value_or(Period{since.value_or(0), until.value_or(report.now)});
    // There may be events after the last record.
    if (!until)
        report.period.to = std::max(report.period.to, std::min(report.now, report.period.to + 86400));
    if (report.period.from > report.period.to)
        report.period.to = report.now;
    if (period && report.period.from <= report.period.to)
        report.logs = ReadLogFigures(table, report.period, isWhole, kTopDevices);
    report.eventDatabase = EventDatabasePath(options.eventsDb, root);
    report.events = ReadEventsOf(report.eventDatabase, !options.eventsDb.empty(), report.period);
    report.accounting = ReadAccounting(AccountingPath("", root), report.period, report.logs.grid);
}

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.inUtc);
    Report report;
    report.mostEvents = ParseNumber("--events", options.events, 1, kMaxEvents);
    report.now = std::time(nullptr);
    report.program = "kelosyslog " KELOSYSLOG_VERSION;
    ReadReport(options, root, report);
    AtomicFile file(options.target);
    file.Write(RenderReport(report));
    file.Commit();
    return kExitFound;
}

} // namespace

void AddReport(Program &program) {
    auto options = std::make_shared<Options>();
    Command command =
        AddSubcommand(program, "report", "Write an HTML page about the logs and events of a period",
                      [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    command.AddText("file", options->target, "FILE", "The page; replaced only by a whole one").Required();
    const std::string group = "Which period";
    command.AddText("-S,--since", options->filter.since, "TIME", "From this time on").Group(group);
    command
        .AddText("-U,--until", options->filter.until, "TIME",
                 "Up to this second; a day alone ends before it begins")
        .Group(group);
    command.AddText("--events", options->events, "N", "List the newest N events (default: 100)");
    AddUtcOption(command, options->inUtc);
    AddTableOptions(command, options->table, false);
    AddPartialOption(command, options->table);
    command.AddText("--events-db", options->eventsDb, "PATH", "This event database, not the server's own")
        .Group("Where to look");
}

} // namespace kelo::tool
