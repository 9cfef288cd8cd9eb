#include "report/report_page.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <kainjow/mustache.hpp>

#include "base/text_encoding.h"
#include "base/time_format.h"
#include "kelosyslog/records.h"
#include "report/report_template.h"

namespace kelo::tool {
namespace {

using Data = kainjow::mustache::data;
using List = kainjow::mustache::list;

constexpr double kChartWidth = 1000; // units of the charts' own coordinates
constexpr double kChartHeight = 200;
constexpr size_t kTimeLabels = 5;
constexpr size_t kLongestText = 2000; // bytes of one cell
constexpr std::array<const char *, kSeverityClasses> kClassNames = {"errors", "warnings", "information",
                                                                    "debug"};

// A text from a database as one line without markup.
std::string CellText(const std::string &text) {
    std::string visible = EscapeForTerminal(text);
    if (visible.size() <= kLongestText)
        return visible;
    return visible.substr(0, WholeCharacters(visible, kLongestText)) + " \u2026";
}

std::string Formatted(const char *format, double number) {
    char text[64];
    std::snprintf(text, sizeof text, format, number);
    return text;
}

std::string Coordinate(double number) {
    return Formatted("%.2f", number);
}

// "1,234,567"
std::string Count(uint64_t number) {
    std::string text = std::to_string(number);
    for (size_t at = text.size(); at > 3; at -= 3)
        text.insert(at - 3, ",");
    return text;
}

std::string Counted(uint64_t number, const std::string &noun) {
    return Count(number) + " " + noun + (number == 1 ? "" : "s");
}

std::string Rate(double perSecond) {
    if (perSecond >= 100 || perSecond == std::floor(perSecond))
        return Count(static_cast<uint64_t>(std::llround(perSecond)));
    return Formatted(perSecond >= 1 ? "%.1f" : "%.2g", perSecond);
}

std::string Share(uint64_t part, uint64_t whole) {
    return whole == 0 ? ""
                      : Formatted("%.1f %%", 100.0 * static_cast<double>(part) / static_cast<double>(whole));
}

std::string SpanName(int64_t seconds) {
    const struct {
        int64_t seconds;
        const char *noun;
    } units[] = {{86400, "day"}, {3600, "hour"}, {60, "minute"}, {1, "second"}};
    for (const auto &unit : units) {
        if (seconds % unit.seconds == 0)
            return Counted(static_cast<uint64_t>(seconds / unit.seconds), unit.noun);
    }
    return "";
}

uint64_t Sum(const std::array<uint64_t, kSeverityClasses> &counts) {
    uint64_t sum = 0;
    for (const uint64_t count : counts)
        sum += count;
    return sum;
}

Data Tile(const std::string &name, const std::string &value, const std::string &note) {
    Data tile;
    tile.set("name", name);
    tile.set("value", value);
    tile.set("note", note);
    return tile;
}

// Bars side by side over a time grid.
class TimeChart {
public:
    TimeChart(const TimeGrid &grid, double most) : grid_(grid), most_(std::max(most, 1e-9)) {}

    // A piece of the bar of `span` that reaches from `bottom` to `top`, in the unit of `most`.
    void Add(size_t span, double bottom, double top, const std::string &style, const std::string &title) {
        const double step = kChartWidth / static_cast<double>(grid_.count);
        Data bar;
        bar.set("x", Coordinate(static_cast<double>(span) * step + step * 0.06));
        bar.set("width", Coordinate(step * 0.88));
        bar.set("y", Coordinate(kChartHeight * (1 - top / most_)));
        bar.set("height", Coordinate(kChartHeight * (top - bottom) / most_));
        bar.set("style", style);
        bar.set("title", title);
        bars_.push_back(bar);
    }

    Data Finish(const TimeFormat &time) const {
        Data chart;
        chart.set("bars", bars_);
        chart.set("most", Rate(most_));
        chart.set("half", Rate(most_ / 2));
        List labels;
        for (size_t i = 0; i < kTimeLabels; ++i) {
            const std::string moment = time.Plain(grid_.Begin(i * grid_.count / kTimeLabels));
            Data label; // "2020-01-02 10:11:12" without parts that are redundant here
            label.set("day", moment.substr(5, 5));
            label.set("time", grid_.widthSec < 86400 ? moment.substr(11, grid_.widthSec < 60 ? 8 : 5) : "");
            labels.push_back(label);
        }
        chart.set("labels", labels);
        return chart;
    }

private:
    TimeGrid grid_;
    double most_;
    List bars_;
};

Data LogChart(const Report &report, const TimeFormat &time) {
    const LogFigures &logs = report.logs;
    const auto width = static_cast<double>(logs.grid.widthSec);
    uint64_t most = 0;
    for (const auto &span : logs.spans)
        most = std::max(most, Sum(span));
    TimeChart chart(logs.grid, static_cast<double>(most) / width);
    for (size_t i = 0; i < logs.spans.size(); ++i) {
        double bottom = 0;
        for (size_t kind = 0; kind < kSeverityClasses; ++kind) {
            const uint64_t count = logs.spans[i][kind];
            const double top = bottom + static_cast<double>(count) / width;
            if (count > 0)
                chart.Add(i, bottom, top, kClassNames[kind],
                          time.Plain(logs.grid.Begin(i)) + ": " + Count(count) + " " + kClassNames[kind] +
                              " of " + Counted(Sum(logs.spans[i]), "log"));
            bottom = top;
        }
    }
    return chart.Finish(time);
}

Data AccountingChart(const Report &report, const TimeFormat &time) {
    const TimeGrid &grid = report.logs.grid;
    const std::vector<int64_t> &peaks = report.accounting.peaks;
    const int64_t most = *std::max_element(peaks.begin(), peaks.end());
    TimeChart chart(grid, static_cast<double>(most));
    for (size_t i = 0; i < peaks.size(); ++i) {
        if (peaks[i] > 0)
            chart.Add(i, 0, static_cast<double>(peaks[i]), "information",
                      time.Plain(grid.Begin(i)) + ": up to " +
                          Counted(static_cast<uint64_t>(peaks[i]), "log") + " in a second");
    }
    return chart.Finish(time);
}

// The strip under the chart: one mark per span with events, in the colour of the worst.
List EventMarks(const Report &report, const TimeFormat &time) {
    struct Mark {
        uint64_t count = 0;
        int worst = 0;
    };
    const TimeGrid &grid = report.logs.grid;
    std::map<size_t, Mark> marks;
    for (const Event &event : report.events.value_or(std::list<Event>())) {
        if (const std::optional<size_t> span = grid.Find(event.time)) {
            ++marks[*span].count;
            marks[*span].worst = std::max(marks[*span].worst, event.level);
        }
    }
    List list;
    for (const auto &[span, mark] : marks) {
        Data data;
        const double step = kChartWidth / static_cast<double>(grid.count);
        data.set("x", Coordinate(static_cast<double>(span) * step));
        data.set("width", Coordinate(std::max(step, 6.0)));
        data.set("level", EventLevelName(mark.worst));
        data.set("title", time.Plain(grid.Begin(span)) + ": " + Counted(mark.count, "event"));
        list.push_back(data);
    }
    return list;
}

Data RankRow(const std::string &name, uint64_t count, uint64_t most, uint64_t whole,
             const std::string &style) {
    Data row;
    row.set("name", CellText(name.empty() ? "(no name)" : name));
    row.set("count", Count(count));
    row.set("share", Share(count, whole));
    row.set("width",
            Coordinate(most == 0 ? 0 : 100.0 * static_cast<double>(count) / static_cast<double>(most)));
    row.set("style", style);
    return row;
}

List DeviceRows(std::vector<std::pair<std::string, uint64_t>> devices, uint64_t whole) {
    std::stable_sort(devices.begin(), devices.end(),
                     [](const auto &a, const auto &b) { return a.second > b.second; });
    List rows;
    for (const auto &[name, count] : devices)
        rows.push_back(RankRow(name, count, devices.front().second, whole, "information"));
    return rows;
}

List SeverityRows(const LogFigures &logs) {
    const uint64_t most =
        std::max(*std::max_element(logs.severities.begin(), logs.severities.end()), logs.otherSeverities);
    List rows;
    for (size_t i = 0; i < kSeverities; ++i) {
        const char *style = i <= SYSLOG_PRIO_ERR       ? "errors"
                            : i == SYSLOG_PRIO_WARNING ? "warnings"
                            : i == SYSLOG_PRIO_DEBUG   ? "debug"
                                                       : "information";
        rows.push_back(RankRow(g_MappingSyslogPrior[i], logs.severities[i], most, logs.total, style));
    }
    if (logs.otherSeverities > 0)
        rows.push_back(RankRow("(other)", logs.otherSeverities, most, logs.total, "debug"));
    return rows;
}

List EventRows(const Report &report, const TimeFormat &time) {
    List rows;
    for (const Event &event : *report.events) {
        Data row;
        row.set("level", EventLevelName(event.level));
        row.set("time", time.Plain(event.time));
        row.set("user", CellText(event.user));
        row.set("event", CellText(event.event));
        rows.push_back(row);
        if (rows.size() == report.mostEvents)
            break;
    }
    return rows;
}

List Tiles(const Report &report, const TimeFormat &time) {
    const LogFigures &logs = report.logs;
    uint64_t errors = 0;
    for (size_t i = 0; i <= SYSLOG_PRIO_ERR; ++i)
        errors += logs.severities[i];
    size_t busiest = 0;
    for (size_t i = 0; i < logs.spans.size(); ++i) {
        if (Sum(logs.spans[i]) > Sum(logs.spans[busiest]))
            busiest = i;
    }
    const auto seconds = static_cast<double>(report.period.to - report.period.from + 1);
    const std::string spanName = SpanName(logs.grid.widthSec);
    List tiles;
    tiles.push_back(
        Tile("Logs", Count(logs.total), Rate(static_cast<double>(logs.total) / seconds) + " a second"));
    if (!logs.spans.empty())
        tiles.push_back(Tile(
            "Busiest " + (spanName.starts_with("1 ") ? spanName.substr(2) : spanName),
            Rate(static_cast<double>(Sum(logs.spans[busiest])) / static_cast<double>(logs.grid.widthSec)) +
                "/s",
            "from " + time.Plain(logs.grid.Begin(busiest)).substr(0, 16)));
    tiles.push_back(Tile("Errors and worse", Count(errors), Share(errors, logs.total)));
    tiles.push_back(Tile("Devices", Count(logs.deviceCount), "that sent logs"));
    if (report.events)
        tiles.push_back(Tile("Events", Count(report.events->size()), "of this server"));
    return tiles;
}

void SetAccounting(Data &page, const Report &report, const TimeFormat &time) {
    const AccountingFigures &figures = report.accounting;
    const bool hasChart = !figures.peaks.empty();
    page.set("hasAccounting", hasChart || !figures.devices.empty());
    page.set("hasAccountingChart", hasChart);
    if (hasChart)
        page.set("accountingChart", AccountingChart(report, time));
    page.set("accountingDevices", DeviceRows({figures.devices.begin(), figures.devices.end()}, 0));
}

} // namespace

std::string RenderReport(const Report &report) {
    const TimeFormat time(false);
    const LogFigures &logs = report.logs;
    Data page;
    page.set("from", time.Plain(report.period.from));
    page.set("to", time.Plain(report.period.to));
    page.set("now", time.Plain(report.now));
    page.set("program", report.program);
    page.set("logDatabase", CellText(report.logDatabase));
    page.set("eventDatabase", CellText(report.eventDatabase));
    page.set("tiles", Tiles(report, time));
    page.set("hasLogs", logs.total > 0);
    if (logs.total > 0) {
        page.set("span", SpanName(logs.grid.widthSec));
        page.set("chart", LogChart(report, time));
        page.set("devices", DeviceRows(logs.devices, logs.total));
        page.set("moreDevices", logs.deviceCount > logs.devices.size()
                                    ? Counted(logs.deviceCount - logs.devices.size(), "further device")
                                    : "");
        page.set("severities", SeverityRows(logs));
        const List marks = EventMarks(report, time);
        page.set("hasEventMarks", !marks.empty());
        page.set("eventMarks", marks);
    }
    SetAccounting(page, report, time);
    page.set("hasEventDatabase", report.events.has_value());
    if (report.events) {
        page.set("hasEvents", !report.events->empty());
        page.set("events", EventRows(report, time));
        if (report.events->size() > report.mostEvents)
            page.set("moreEvents", Counted(report.events->size() - report.mostEvents, "older event"));
    }
    kainjow::mustache::mustache view(kReportTemplate);
    return view.render(page);
}

} // namespace kelo::tool
