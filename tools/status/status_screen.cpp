#include "status/status_screen.h"

#include <algorithm>
#include <cstdio>
#include <sstream>

#include "base/text_encoding.h"
#include "base/time_format.h"
#include "print/statistics_table.h"
#include "status/figures.h"
#include "status/listener_table.h"
#include "status/state_names.h"

namespace kelo::tool {
namespace {

constexpr const char *kPlain = "";
constexpr const char *kHeading = "\x1b[1m";
constexpr const char *kGood = "\x1b[1;32m";
constexpr const char *kBad = "\x1b[1;31m";
constexpr const char *kWarning = "\x1b[33m";
constexpr const char *kColourEnd = "\x1b[0m";

struct Line {
    std::string text; // visible
    const char *colour = kPlain;
};
using Lines = std::vector<Line>;

std::string Time(int64_t seconds) {
    return TimeFormat(false).Plain(seconds);
}
std::string Time(const std::optional<int64_t> &seconds) {
    return seconds ? Time(*seconds) : "-";
}
std::string Rate(double perSecond) {
    char text[64];
    std::snprintf(text, sizeof text, "%.1f", perSecond);
    return text;
}

void AddSection(Lines &lines, const std::string &name, const std::string &text, const char *colour) {
    constexpr size_t kColumn = 15;
    lines.push_back({});
    const std::string value = EscapeForTerminal(text);
    lines.push_back({value.empty() ? name : name + std::string(kColumn - name.size(), ' ') + value, colour});
}

void AddText(Lines &lines, const std::string &text, const char *colour = kPlain) {
    lines.push_back({"  " + EscapeForTerminal(text), colour});
}

// The lines of a table with a colour for each row.
void AddTable(Lines &lines, const StatisticsTable &table, const std::vector<const char *> &colours) {
    std::istringstream text(table.Write(OutputFormat::Text, true));
    std::string line;
    for (size_t row = 0; std::getline(text, line); ++row)
        lines.push_back({"  " + line, row == 0 ? kPlain : colours[row - 1]});
}

void AddSyslogNg(Lines &lines, const SyslogNgStatus &status) {
    const bool isGood = status.state == SyslogNgStatus::State::Running;
    std::string text = StateName(status.state);
    if (status.since != 0)
        text += " since " + Time(status.since);
    if (status.pid != 0)
        text += ", process " + std::to_string(status.pid);
    AddSection(lines, "syslog-ng", text, isGood ? kHeading : kBad);
    if (status.state == SyslogNgStatus::State::Stopped)
        return;
    if (!status.problem.empty()) {
        AddText(lines, "no counters: " + status.control + ": " + status.problem);
        return;
    }
    AddText(lines, Counted(status.Received(), "message") + " received by " +
                       Counted(status.sources.size(), "source"));
    StatisticsTable table({{"destination", false},
                           {"processed", true},
                           {"written", true},
                           {"dropped", true},
                           {"queued", true},
                           {"memory", true},
                           {"to", false}});
    std::vector<const char *> colours;
    for (const SyslogNgCounters &counters : status.destinations) {
        table.Add({counters.id, Grouped(counters.processed), Grouped(counters.written),
                   Grouped(counters.dropped), Grouped(counters.queued),
                   Bytes(static_cast<int64_t>(counters.memory)), counters.instance});
        colours.push_back(counters.dropped > 0 ? kBad : kPlain);
    }
    AddTable(lines, table, colours);
}

void AddNetwork(Lines &lines, const NetworkStatus &status) {
    if (status.listeners.empty())
        return;
    AddSection(lines, "listening", "", kHeading);
    const StatisticsTable table = TableOfListeners(status.listeners);
    std::vector<const char *> colours;
    for (const Listener &listener : status.listeners)
        colours.push_back((listener.isOpen || !listener.isKnown) && listener.drops == 0 ? kPlain : kBad);
    AddTable(lines, table, colours);
}

// "12 MiB of 2 GiB, 3 MiB not stored yet, 12 s behind, growing, full in 30 min"
std::string TextOf(const ReceiverState::Spool &spool) {
    std::string text = "spool: " + Bytes(static_cast<int64_t>(spool.bytes)) +
                       (spool.limit > 0 ? " of " + Bytes(static_cast<int64_t>(spool.limit)) : "");
    if (spool.unread == 0)
        return text + ", all stored";
    text += ", " + Bytes(static_cast<int64_t>(spool.unread)) + " not stored yet, " +
            Duration(spool.behindSec) + " behind";
    if (const auto lasts = spool.LastsSec())
        return text + ", growing, full in " + Duration(*lasts);
    if (spool.growth > -1)
        return text;
    const double seconds = static_cast<double>(spool.unread) / -spool.growth;
    return text + ", shrinking, empty in " + Duration(static_cast<int64_t>(seconds));
}

void AddReceiver(Lines &lines, const ReceiverStatus &status, const MessageSpoolStatus &spool) {
    using State = ReceiverStatus::State;
    const ReceiverState &told = status.told;
    if (status.state == State::None || status.state == State::Unreadable) {
        AddSection(lines, "receiver", status.state == State::None ? "never ran here" : "unreadable",
                   status.state == State::None && spool.folder.empty() ? kHeading : kBad);
        if (spool.bytes)
            AddText(lines, "spool: " + Bytes(static_cast<int64_t>(*spool.bytes)) + " in " + spool.folder);
        return;
    }
    std::string text = StateName(status.state);
    text += status.state == State::Stopped ? " at " + Time(told.ended) : " since " + Time(told.started);
    if (status.state == State::Died)
        text = "died after " + Time(told.updated);
    const bool isGood = status.state == State::Running || status.state == State::Stopped;
    AddSection(lines, "receiver", text + ", process " + std::to_string(told.pid), isGood ? kHeading : kBad);
    std::string incomplete;
    uint64_t sum = 0;
    for (const auto &[field, count] : told.incomplete) {
        incomplete += (incomplete.empty() ? " (" : ", ") + field + " " + Grouped(count);
        sum += count;
    }
    AddText(lines, Grouped(told.received) + " received, " + Rate(told.eps) + " a second, " +
                       Grouped(told.stored) + " stored" +
                       (told.database.empty() ? "" : " in " + told.database));
    AddText(lines, Grouped(sum) + " incomplete" + incomplete + (incomplete.empty() ? ", " : "), ") +
                       Grouped(told.rejected) + " rejected, " + Grouped(told.overlong) + " too long, " +
                       Grouped(told.suppressed) + " notifications suppressed");
    if (!told.spool.folder.empty())
        AddText(lines, TextOf(told.spool));
    if (!told.waiting.empty() && status.state != State::Stopped)
        AddText(lines, "waits: " + told.waiting, kBad);
}

void AddDatabases(Lines &lines, const ServerStatus &status) {
    AddSection(lines, "databases", "", kHeading);
    StatisticsTable table({{"name", false},
                           {"state", false},
                           {"size", true},
                           {"wal", true},
                           {"rows", true},
                           {"first", false},
                           {"last", false}});
    std::vector<const char *> colours;
    for (const DatabaseStatus &database : status.databases) {
        const std::string rows =
            database.rows ? (database.isEstimate ? "~" : "") + Grouped(static_cast<uint64_t>(*database.rows))
                          : "-";
        table.Add({database.name, StateName(database.state), Bytes(database.size), Bytes(database.walSize),
                   rows, Time(database.first), Time(database.last)});
        const bool isGood =
            database.state == DatabaseStatus::State::Good || database.state == DatabaseStatus::State::Missing;
        colours.push_back(isGood ? kPlain : kBad);
    }
    AddTable(lines, table, colours);
    for (const DatabaseStatus &database : status.databases) {
        if (database.indexSize)
            AddText(lines, "index for keywords of " + database.name + ": " + Bytes(*database.indexSize) +
                               ", " + Grouped(static_cast<uint64_t>(*database.unindexed)) +
                               " rows not yet in it");
    }
    const ArchiveStatus &archives = status.archives;
    AddText(lines, Counted(static_cast<uint64_t>(archives.files), "archive") + ", " + Bytes(archives.size) +
                       (archives.problem.empty() ? "" : ": " + archives.problem));
}

void AddRetention(Lines &lines, const RetentionStatus &status) {
    if (!status.rule && status.problem.empty() && !status.isReceptionStopped)
        return;
    AddSection(lines, "retention", status.rule ? DescribeRetention(*status.rule) : "no rule",
               status.problem.empty() ? kHeading : kBad);
    if (!status.problem.empty())
        AddText(lines, status.problem, kBad);
    if (status.isReceptionStopped)
        AddText(lines, "receiving is stopped", kBad);
}

void AddAccounting(Lines &lines, const ServerStatus &status) {
    if (!status.accounting)
        return;
    const AccountingStatus &accounting = *status.accounting;
    AddSection(lines, "rate",
               accounting.newest == 0
                   ? "no sample"
                   : Rate(accounting.perSecond) + " logs a second, " + Rate(accounting.perSecondHour) +
                         " in the hour; newest sample " + Duration(status.time - accounting.newest) + " old",
               kHeading);
    if (accounting.devices.empty())
        return;
    StatisticsTable table({{"device", false}, {"logs", true}, {"percent", true}});
    for (const auto &[device, count] : accounting.devices) {
        const double part = accounting.total > 0
                                ? 100 * static_cast<double>(count) / static_cast<double>(accounting.total)
                                : 0;
        table.Add({device, Grouped(count), Rate(part)});
    }
    AddTable(lines, table, std::vector<const char *>(accounting.devices.size(), kPlain));
}

void AddNotifications(Lines &lines, const NotificationStatus &status, int64_t now) {
    std::string text = Grouped(status.waiting) + " waiting, " + Grouped(status.failed) + " given up";
    if (status.oldest != 0)
        text += "; the oldest waits for " + Duration(now - status.oldest);
    const bool isGood = status.problem.empty() && status.failed == 0;
    AddSection(lines, "notifications", status.problem.empty() ? text : status.problem,
               isGood ? kHeading : kBad);
    for (const ChannelHealth &channel : status.channels) {
        if (channel.isOn)
            AddText(lines, channel.name + ": " + (channel.problem.empty() ? "works" : channel.problem),
                    channel.problem.empty() ? kPlain : kBad);
    }
}

void AddEvents(Lines &lines, const std::vector<Event> &events) {
    if (events.empty())
        return;
    AddSection(lines, "events", "", kHeading);
    for (const Event &event : events) {
        const char *colour = event.level <= 0 ? kPlain : event.level == 1 ? kWarning : kBad;
        AddText(lines,
                Time(event.time) + "  " + EventLevelName(event.level) + "  " + event.user + "  " +
                    event.event,
                colour);
    }
}

void AddVolumes(Lines &lines, const std::vector<VolumeStatus> &volumes) {
    AddSection(lines, "disk space", "", kHeading);
    for (const VolumeStatus &volume : volumes) {
        std::string text = Bytes(static_cast<int64_t>(volume.free)) + " (" + Rate(volume.FreePercent()) +
                           " %) free of " + Bytes(static_cast<int64_t>(volume.size)) + ":";
        for (const std::string &folder : volume.folders)
            text += " " + folder;
        AddText(lines, text, volume.FreeLevel() != VolumeStatus::Level::Good ? kBad : kPlain);
    }
}

// A point that needs attention, in as many lines as necessary.
void AddPoint(Lines &lines, const std::string &point, size_t width) {
    std::string rest = "! " + EscapeForTerminal(point);
    constexpr size_t kLeast = 20;
    while (width >= kLeast && CharacterCount(rest) > width) {
        const size_t room = FirstCharacters(rest, width);
        const size_t blank = rest.rfind(' ', room);
        const size_t end = blank == std::string::npos || blank < 3 ? room : blank;
        lines.push_back({rest.substr(0, end), kBad});
        rest = "  " + rest.substr(rest[end] == ' ' ? end + 1 : end);
    }
    lines.push_back({rest, kBad});
}

void AddHead(Lines &lines, const ServerStatus &status, size_t width) {
    const size_t count = status.attention.size();
    const std::string verdict = count == 0   ? "All is well"
                                : count == 1 ? "1 thing needs attention"
                                             : std::to_string(count) + " things need attention";
    lines.push_back({verdict + " (" + Time(status.time) + ")", count == 0 ? kGood : kBad});
    for (const std::string &point : status.attention)
        AddPoint(lines, point, width);
}

std::string Fit(const std::string &text, size_t width) {
    if (width == 0 || CharacterCount(text) <= width)
        return text;
    return text.substr(0, FirstCharacters(text, width - 1)) + ">";
}

} // namespace

std::string RenderStatus(const ServerStatus &status, const ScreenLayout &layout) {
    Lines lines;
    AddHead(lines, status, layout.width);
    AddSyslogNg(lines, status.syslogNg);
    AddNetwork(lines, status.network);
    AddReceiver(lines, status.receiver, status.messageSpool);
    AddDatabases(lines, status);
    AddRetention(lines, status.retention);
    AddAccounting(lines, status);
    AddNotifications(lines, status.notifications, status.time);
    AddEvents(lines, status.events);
    AddVolumes(lines, status.volumes);
    if (layout.height > 0 && lines.size() > layout.height) {
        const size_t hidden = lines.size() - layout.height + 1;
        lines.resize(layout.height - 1);
        lines.push_back({"(" + std::to_string(hidden) + " more lines)"});
    }
    std::string text;
    for (const Line &line : lines) {
        const bool isColoured = layout.hasColour && line.colour != kPlain && !line.text.empty();
        text += (isColoured ? line.colour : "") + Fit(line.text, layout.width) +
                (isColoured ? kColourEnd : "") + "\n";
    }
    return text;
}

} // namespace kelo::tool
