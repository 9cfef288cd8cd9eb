// kelosyslog events add, kelosyslog events clear-log.

#include <fcntl.h>
#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "base/errors.h"
#include "base/files.h"
#include "cli/completion.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "commands/events.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/logger.h"
#include "read/event_log.h"

namespace kelo::tool {
namespace {

using Arguments = std::vector<std::string>;

struct Kind {
    const char *name;
    const char *arguments;
    size_t count;
    int (*add)(Logger &logger, const Arguments &arguments);
};

_SYSLOG_DB_PRIORITY_tag ParseSeverity(const std::string &text) {
    std::string names;
    for (int32_t severity = SYSLOG_PRIO_EMERG; severity <= SYSLOG_PRIO_DEBUG; ++severity) {
        if (text == g_MappingSyslogPrior[severity])
            return static_cast<_SYSLOG_DB_PRIORITY_tag>(severity);
        names += std::string(severity == 0 ? "" : ", ") + g_MappingSyslogPrior[severity];
    }
    throw UsageError("severity: '" + text + "' is no severity; severities are " + names);
}

constexpr std::array<Kind, 10> kKinds = {{
    {"server-start", "TEXT", 1, [](Logger &l, const Arguments &a) { return l.LogAddServStart(a[0]); }},
    {"server-stop", "TEXT", 1, [](Logger &l, const Arguments &a) { return l.LogAddServStop(a[0]); }},
    {"eps", "NUMBER", 1,
     [](Logger &l, const Arguments &a) {
         return l.LogAddNotifyEps(ParseNumber("eps", a[0], 0, std::numeric_limits<uint64_t>::max()));
     }},
    {"severity", "SEVERITY LOG", 2,
     [](Logger &l, const Arguments &a) { return l.LogAddNotifySev(ParseSeverity(a[0]), a[1]); }},
    {"keyword", "KEYWORD LOG", 2, [](Logger &l, const Arguments &a) { return l.LogAddNotifyKw(a[0], a[1]); }},
    {"archive-start", "NAME", 1, [](Logger &l, const Arguments &a) { return l.LogAddArchStart(a[0]); }},
    {"archive-finish", "NAME", 1, [](Logger &l, const Arguments &a) { return l.LogAddArchFinish(a[0]); }},
    {"archive-failed", "NAME", 1, [](Logger &l, const Arguments &a) { return l.LogAddArchFailed(a[0]); }},
    {"log-cleared", "DATABASE USER", 2,
     [](Logger &l, const Arguments &a) { return l.LogAddLogClear(a[0], a[1]); }},
    {"volume-full", "", 0, [](Logger &l, const Arguments &) { return l.LogAddVolFull(); }},
}};

const Kind &FindKind(const std::string &name, size_t arguments) {
    std::string names;
    for (const Kind &kind : kKinds) {
        if (name == kind.name && arguments == kind.count)
            return kind;
        if (name == kind.name)
            throw UsageError("add: " + name + " takes " +
                             (kind.count == 0 ? "nothing more" : kind.arguments) + ", not " +
                             std::to_string(arguments) + " values");
        names += (names.empty() ? "" : ", ") + std::string(kind.name);
    }
    throw UsageError("add: '" + name + "' is no kind of event; kinds are " + names);
}

int Add(const EventsOptions &options, const std::string &name, const Arguments &arguments,
        const std::string &root) {
    RefuseListOptions(options, "add", true);
    const Kind &kind = FindKind(name, arguments.size());
    const std::string reason = AddEvent(root, [&](Logger &logger) { return kind.add(logger, arguments); });
    if (!reason.empty())
        throw DatabaseError("cannot add the event to " + EventDatabasePath("", root) + ": " + reason);
    return kExitFound;
}

std::string CurrentUser() {
    const passwd *entry = getpwuid(getuid());
    return entry != nullptr ? entry->pw_name : std::to_string(getuid());
}

// A typing error must not remove a file that is not a log database.
void RequireDatabase(const std::string &path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0)
        throw DatabaseError("cannot clear " + path + ": " + std::strerror(errno));
    constexpr std::string_view kMagic("SQLite format 3\0", 16);
    std::array<char, kMagic.size()> start{};
    const FileHandle file(S_ISREG(status.st_mode) ? open(path.c_str(), O_RDONLY | O_CLOEXEC) : -1);
    const bool isRead =
        file && read(file.Get(), start.data(), start.size()) == static_cast<ssize_t>(start.size());
    if (!isRead || std::string_view(start.data(), start.size()) != kMagic)
        throw DatabaseError("cannot clear " + path + ": it is not an SQLite database");
}

struct ClearOptions {
    std::string database;
    std::string user;
    bool isConfirmed = false;
};

int ClearLog(const EventsOptions &options, const ClearOptions &clear, const std::string &root) {
    RefuseListOptions(options, "clear-log", true);
    const std::string path = std::filesystem::path(FollowLinks(clear.database)).lexically_normal().string();
    RequireDatabase(path);
    if (!clear.isConfirmed && !Confirm("clear-log", "delete all logs in " + path)) {
        PrintMessage("nothing deleted");
        return kExitNothing;
    }
    const std::string user = clear.user.empty() ? CurrentUser() : clear.user;
    Logger().LogClear(path, user);
    if (access(path.c_str(), F_OK) == 0)
        throw DatabaseError("cannot delete " + path);
    // The writer of the working log continues to write into the deleted file until it is reloaded.
    if (path == ResolveLogTable({}, root).path && SyslogngHupSignalSend() != 0)
        PrintMessage("syslog-ng was not told and may go on writing to the deleted file; see the system log");
    const std::string events = EventDatabasePath("", root);
    const std::list<Event> newest = ReadEvents(events, 0, 1);
    if (newest.empty() || newest.front().event != path + " was cleared by " + user)
        throw DatabaseError("deleted " + path + ", but " + events +
                            " does not record it; see the system log");
    return kExitFound;
}

} // namespace

void AddEventsAdd(Program &program, Command events, const SharedEventsOptions &options) {
    struct AddOptions {
        std::string kind;
        Arguments arguments;
    };
    auto add = std::make_shared<AddOptions>();
    Command command = AddEventsAction(events, options, "add", "Add an event of the server's user SYSTEM",
                                      [state = options.get(), add, &program] {
                                          return Add(*state, add->kind, add->arguments, program.root);
                                      });
    std::string footer = "Kinds and their values:\n";
    std::vector<std::string> names;
    for (const Kind &kind : kKinds) {
        footer += std::string("  ") + kind.name + " " + kind.arguments + "\n";
        names.emplace_back(kind.name);
    }
    command.Footer(footer);
    OfferWords(command.AddText("kind", add->kind, "KIND", ""), names).Required();
    command.AddTexts("value", add->arguments, "VALUE", "").AnyNumberOrNone();
}

void AddEventsClearLog(Program &program, Command events, const SharedEventsOptions &options) {
    auto clear = std::make_shared<ClearOptions>();
    Command command = AddEventsAction(
        events, options, "clear-log", "Delete a log database and record who did it",
        [state = options.get(), clear, &program] { return ClearLog(*state, *clear, program.root); });
    command.AddText("database", clear->database, "DATABASE", "").Required();
    command.AddText("--user", clear->user, "NAME", "Who clears it (default: the user of this process)");
    command.AddFlag("-y,--yes", clear->isConfirmed, "Do not ask");
}

} // namespace kelo::tool
