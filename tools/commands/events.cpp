// kelosyslog events: the server's own event log.

#include "commands/events.h"
#include "commands/commands.h"

#include <algorithm>
#include <ctime>
#include <limits>

#include "base/atomic_file.h"
#include "base/errors.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "commands/follow.h"
#include "kelosyslog/logger.h"
#include "print/event_fields.h"
#include "read/event_log.h"
#include "report/event_page.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "Without a command the events are listed, newest first; 'kelosyslog events COMMAND --help' tells "
    "more.\n\n"
    "Examples:\n"
    "  kelosyslog events -n 20                          the newest 20 events\n"
    "  kelosyslog events -n 20 --offset 20              the page after them\n"
    "  kelosyslog events -p warning --since yesterday   warnings and errors since yesterday\n"
    "  kelosyslog events -f -p error -o jsonl           follow the errors\n"
    "  kelosyslog events add server-start 1.0\n"
    "  kelosyslog events export events.html\n"
    "  kelosyslog events clear-log /volume1/old.db\n\n"
    "Exit status: 0 found or done, 1 nothing matched or not confirmed, 2 usage, 3 database, 4 output.";

constexpr uint64_t kMaxLines = std::numeric_limits<int>::max();

struct EventPage {
    int limit = 0; // 0 for all
    int offset = 0;
};

EventPage ParsePage(const EventsOptions &options) {
    EventPage page;
    if (!options.lines.empty() && options.lines != "all")
        page.limit = static_cast<int>(ParseNumber("--lines", options.lines, 1, kMaxLines));
    if (!options.offset.empty())
        page.offset = static_cast<int>(ParseNumber("--offset", options.offset, 0, kMaxLines));
    return page;
}

// The library reads pages only without a filter; a page of filtered events needs all of them.
std::list<Event> SelectedEvents(const std::string &path, const EventsOptions &options,
                                const EventPage &page) {
    if (IsEmpty(options.filter)) {
        const bool isWhole = page.limit == 0 && page.offset == 0;
        const int limit = page.limit == 0 ? std::numeric_limits<int>::max() : page.limit;
        return ReadEvents(path, page.offset, isWhole ? 0 : limit);
    }
    const EventFilter filter = ParseEventFilter(options.filter, std::time(nullptr));
    std::list<Event> events = ReadEvents(path);
    events.remove_if([&](const Event &event) { return !filter.Matches(event); });
    for (int skipped = 0; skipped < page.offset && !events.empty(); ++skipped)
        events.pop_front();
    if (page.limit > 0 && events.size() > static_cast<size_t>(page.limit))
        events.resize(static_cast<size_t>(page.limit));
    return events;
}

// The events that are there, up to 10 or --lines, and then those that are added, in their order.
class EventFollower {
public:
    EventFollower(const EventsOptions &options, const std::string &path)
        : path_(path), filter_(ParseEventFilter(options.filter, std::time(nullptr))),
          file_(IdentifyFile(path)), lastId_(NewestEventId(path)),
          present_(SelectedEvents(path, options, PageOf(options))) {
        present_.reverse();
        for (const Event &event : present_)
            lastId_ = std::max<int64_t>(lastId_, event.id);
    }

    uint64_t Print(const std::function<void(const Event &)> &print) {
        uint64_t count = present_.size();
        std::for_each(present_.begin(), present_.end(), print);
        present_.clear();
        for (const Event &event : News()) {
            if (filter_.Matches(event)) {
                print(event);
                ++count;
            }
        }
        return count;
    }

private:
    static EventPage PageOf(const EventsOptions &options) {
        EventPage page = ParsePage(options);
        if (options.lines.empty() && options.filter.since.empty())
            page.limit = 10;
        return page;
    }

    // Another file, or none, may have taken the place of the database; a fresh one has no table yet.
    std::vector<Event> News() {
        const std::optional<FileIdentity> current = IdentifyFile(path_);
        if (!current)
            return {};
        try {
            int64_t lastId = current != file_ ? 0 : lastId_;
            std::vector<Event> events = ReadEventsAfter(path_, lastId);
            file_ = current;
            lastId_ = lastId;
            return events;
        } catch (const DatabaseError &) {
            if (current == file_ && IdentifyFile(path_) == current)
                throw;
            return {};
        }
    }

    std::string path_;
    EventFilter filter_;
    std::optional<FileIdentity> file_; // the one that was read last
    int64_t lastId_;
    std::list<Event> present_;
};

FollowOptions ParseFollow(const EventsOptions &options) {
    if (!options.offset.empty())
        throw UsageError("--follow: goes not with --offset");
    FollowOptions follow;
    if (!options.idle.empty())
        follow.idleSec = ParseNumber("--idle", options.idle, 0, kMaxLines);
    follow.until = LastSecond(options.filter, std::time(nullptr));
    return follow;
}

int List(const EventsOptions &options, const std::string &root) {
    if (!options.follow && !options.idle.empty())
        throw UsageError("--idle: only together with --follow");
    ApplyUtc(options.output.inUtc);
    RecordLayout layout = MakeLayout(options.output, TableKind::Logs);
    if (layout.format == OutputFormat::Short)
        throw UsageError(
            "--output: events have no form 'short'; forms are text, json, jsonl, csv, spreadsheet");
    layout.fields = EventFields();
    const std::string path = EventDatabasePath(options.db, root);
    Output output(!options.output.noPager && !options.follow);
    const std::unique_ptr<RecordFormatter> writer = MakeRecordWriter(layout);
    std::string text;
    writer->Begin(text);
    const auto print = [&](const Event &event) {
        writer->Add(RecordOfEvent(event), text);
        output.Write(text);
        text.clear();
    };
    uint64_t count = 0;
    if (options.follow) {
        const FollowOptions follow = ParseFollow(options);
        EventFollower follower(options, path);
        count = RepeatUntilOver(
            follow, [&] { return follower.Print(print); }, output);
    } else {
        const std::list<Event> events = SelectedEvents(path, options, ParsePage(options));
        std::for_each(events.begin(), events.end(), print);
        count = events.size();
    }
    writer->End(text);
    output.Write(text);
    output.Finish();
    return count == 0 ? kExitNothing : kExitFound;
}

int Count(const EventsOptions &options, const std::string &root) {
    if (!options.lines.empty() || !options.offset.empty() || options.follow || !options.idle.empty())
        throw UsageError("count: goes neither with --lines, --offset, --follow nor --idle");
    const OutputFormat format = ParseKeyValuesFormat(options.output.format);
    ApplyUtc(options.output.inUtc);
    const std::string path = EventDatabasePath(options.db, root);
    int64_t count = 0;
    if (IsEmpty(options.filter))
        count = Logger().LogCount(path);
    else
        count = static_cast<int64_t>(SelectedEvents(path, options, {}).size());
    if (count < 0)
        FailEventDatabase(path);
    Output output(false);
    output.Write(format == OutputFormat::Text ? std::to_string(count) + "\n"
                                              : "{\"count\":" + std::to_string(count) + "}\n");
    output.Finish();
    return count > 0 ? kExitFound : kExitNothing;
}

int Export(const EventsOptions &options, const std::string &target, const std::string &root) {
    RefuseListOptions(options, "export", false);
    ApplyUtc(options.output.inUtc);
    const std::list<Event> events = ReadEvents(EventDatabasePath(options.db, root));
    if (events.empty()) {
        PrintMessage("no events to export");
        return kExitNothing;
    }
    AtomicFile file(target);
    file.Write(RenderEventPage(events));
    file.Commit();
    return kExitFound;
}

void AddExport(Program &program, Command events, const SharedEventsOptions &options) {
    auto target = std::make_shared<std::string>();
    Command command = AddEventsAction(
        events, options, "export", "Write all events to an HTML page; FILE is replaced only by a whole one",
        [state = options.get(), target, &program] { return Export(*state, *target, program.root); });
    command.AddText("file", *target, "FILE", "").Required();
}

void AddListOptions(Command command, EventsOptions &options) {
    command.AddText("--db", options.db, "PATH", "This event database, not the server's own");
    const std::string which = "Which events";
    command.AddText("-S,--since", options.filter.since, "TIME", "From this time on").Group(which);
    command
        .AddText("-U,--until", options.filter.until, "TIME",
                 "Up to this second; a day alone ends before it begins")
        .Group(which);
    OfferList(command.AddTexts(
                  "-p,--priority", options.filter.severities, "LEVEL",
                  "information, warning or error. A single one means it and all worse; '!level' excludes"),
              {"information", "warning", "error"})
        .Group(which);
    const std::string howMany = "How many";
    command.AddText("-n,--lines", options.lines, "N", "The newest N events, or 'all' (default)")
        .Group(howMany);
    command.AddText("--offset", options.offset, "N", "Skip the N newest events first").Group(howMany);
    command
        .AddFlag("-f,--follow", options.follow,
                 "Print the newest 10 events (or -n; all with --since), oldest first, and then what is "
                 "added, until "
                 "--until has passed, --idle has, or nobody reads any more")
        .Group(howMany);
    command.AddText("--idle", options.idle, "SECONDS", "Stop following after SECONDS without a new event")
        .Group(howMany);
    const std::string how = "How to print";
    OfferWords(command.AddText("-o,--output", options.output.format, "FORMAT",
                               "text (default), json (one array), jsonl (an object per line), csv, "
                               "spreadsheet (csv without formulas)"),
               {"text", "json", "jsonl", "csv", "spreadsheet"})
        .Group(how);
    command.AddFlag("--no-header", options.output.noHeader, "No heading in text, csv and spreadsheet")
        .Group(how);
    command.AddFlag("--utc", options.output.inUtc, "Read and print times in UTC, not in local time")
        .Group(how);
    command
        .AddText("--color", options.output.colour, "WHEN",
                 "auto (default: on a terminal, unless NO_COLOR is set), always, never")
        .Group(how);
    command.AddFlag("--no-pager", options.output.noPager, "Do not start PAGER on a terminal").Group(how);
}

} // namespace

Command AddEventsAction(Command events, const SharedEventsOptions &options, const std::string &name,
                        const std::string &description, std::function<int()> action) {
    Command command = events.AddBelow(name, description);
    // Runs before the callback of "events" itself.
    command.WhenChosen([options, action = std::move(action)] { options->action = action; });
    return command;
}

void RefuseListOptions(const EventsOptions &options, const std::string &action, bool withDb) {
    if (!IsEmpty(options.filter) || !options.lines.empty() || !options.offset.empty() || options.follow ||
        !options.idle.empty())
        throw UsageError(action + ": goes with no option that selects events");
    if (withDb && !options.db.empty())
        throw UsageError("--db: " + action +
                         " writes to the server's own event log; use --root to choose it");
}

void AddEvents(Program &program) {
    auto options = std::make_shared<EventsOptions>();
    Command command = AddSubcommand(
        program, "events", "Show, add, export and count the server's own events",
        [options, &program] { return options->action ? options->action() : List(*options, program.root); });
    command.Footer(kFooter);
    command.NeedBelow(0, 1);
    AddEventsAction(command, options, "count", "Print the number of events",
                    [state = options.get(), &program] { return Count(*state, program.root); });
    AddEventsAdd(program, command, options);
    AddExport(program, command, options);
    AddEventsClearLog(program, command, options);
    AddListOptions(command, *options);
}

} // namespace kelo::tool
