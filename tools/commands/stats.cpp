// kelosyslog stats: the counts of the accounting.

#include <langinfo.h>

#include <algorithm>
#include <clocale>
#include <cstring>
#include <ctime>
#include <limits>
#include <map>
#include <optional>

#include "base/errors.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "commands/stats_forget.h"
#include "kelosyslog/dbutil.h"
#include "print/statistics_table.h"
#include "read/accounting_samples.h"
#include "read/eps_series.h"
#include "read/time_expression.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "devices      logs per device since counting began, most first\n"
    "device NAME  the same of one device\n"
    "total        logs of all devices\n"
    "eps          logs per second, minute or hour; the last day unless --since or --until is given\n"
    "forget NAME  removes devices and their counts; a receiver that runs forgets them too\n\n"
    "Examples:\n"
    "  kelosyslog stats devices --top 10 --plot\n"
    "  kelosyslog stats eps --by hour --since yesterday --plot\n"
    "  kelosyslog stats eps --by second --since -10min --device nas1\n"
    "  kelosyslog stats eps --by hour --per-device -o csv > hours.csv\n"
    "  kelosyslog stats forget 'printer-*' --below 10 --dry-run\n\n"
    "Exit status: 0 found, 1 nothing was counted, 2 usage, 3 database, 4 output.";

constexpr int64_t kDay = 24 * 60 * 60;

struct Options {
    std::string what;
    ForgetOptions forget; // its names are also those of "device NAME"
    std::string db;
    std::string top;
    LogFilter period; // only its bounds are used
    std::string interval = "minute";
    std::string device;
    std::string format = "text";
    bool perDevice = false;
    bool hasEmpty = false;
    bool plot = false;
    bool noHeader = false;
    bool inUtc = false;
};

// The printed table, and the column for a plot.
struct Answer {
    StatisticsTable table;
    size_t bar;
};

std::string Rounded(double number) {
    char text[64];
    std::snprintf(text, sizeof text, "%.2f", number);
    return text;
}

Answer Devices(const std::string &path, const Options &options) {
    const uint64_t top =
        options.top.empty() ? 0 : ParseNumber("--top", options.top, 1, std::numeric_limits<int32_t>::max());
    RequireHistogram(path);
    const std::map<std::string, uint64_t> counts = SyslogDBHistGet(path, static_cast<int>(top));
    std::vector<std::pair<std::string, uint64_t>> devices(counts.begin(), counts.end());
    std::stable_sort(devices.begin(), devices.end(),
                     [](const auto &one, const auto &other) { return one.second > other.second; });
    const auto total = static_cast<double>(SyslogDBHistTotalGet(path));
    StatisticsTable table({{"device", false}, {"count", true}, {"percent", true}});
    for (const auto &[device, count] : devices) {
        const double part = total > 0 ? 100 * static_cast<double>(count) / total : 0;
        table.Add({device, std::to_string(count), Rounded(part)});
    }
    return {table, 1};
}

Answer Device(const std::string &path, const Options &options) {
    RequireHistogram(path);
    std::string quoted;
    for (const char byte : options.forget.names.front())
        quoted.append(byte == '\'' ? 2 : 1, byte);
    StatisticsTable table({{"device", false}, {"count", true}});
    if (const uint64_t count = SyslogDBHistGetSingle(path, quoted); count > 0)
        table.Add({options.forget.names.front(), std::to_string(count)});
    return {table, 1};
}

Answer Total(const std::string &path, const Options &) {
    RequireHistogram(path);
    StatisticsTable table({{"count", true}, {"devices", true}});
    if (const uint64_t total = SyslogDBHistTotalGet(path); total > 0)
        table.Add({std::to_string(total), std::to_string(SyslogDBHistGet(path, 0).size())});
    return {table, 0};
}

// The seconds that are asked for.
struct Period {
    std::optional<int64_t> since;
    std::optional<int64_t> until;
};

Period PeriodOf(const Options &options, int64_t now) {
    const LogFilter &period = options.period;
    if (!period.since.empty())
        return {ParseTimeExpression("--since", period.since, now).seconds, LastSecond(period, now)};
    return {period.until.empty() ? std::optional(now - kDay) : std::nullopt, LastSecond(period, now)};
}

EpsSeries ReadSeries(const std::string &path, const Options &options, const Period &period) {
    const int64_t since = period.since.value_or(0);
    const int64_t until = period.until.value_or(std::numeric_limits<int64_t>::max());
    EpsSeries series(ParseEpsInterval(options.interval),
                     options.device.empty() ? std::nullopt : std::optional(options.device));
    ReadEps(path, since, until, [&](const SYSLOG_LOG_EPS &sample) { series.Add(sample); });
    return series;
}

// A plot also shows the intervals without records: each one of a short gap, and a long gap as one line.
void AddGap(StatisticsTable &table, int64_t from, int64_t to, const EpsSeries &series,
            const TimeFormat &time) {
    constexpr int64_t kLongest = 5;
    const int64_t missing = (to - from) / series.Seconds();
    if (missing > kLongest)
        table.Add({"...", "0", "0.00", "0"});
    else
        for (int64_t start = from; start < to; start += series.Seconds())
            table.Add({time.Plain(start), "0", "0.00", "0"});
}

// A table for people has the time only as text.
StatisticsTable TableOfTimes(std::vector<StatisticsColumn> columns, bool isText) {
    if (!isText)
        columns.push_back({"utcsec", true});
    return StatisticsTable(columns);
}

void AddRow(StatisticsTable &table, int64_t start, bool isText, const TimeFormat &time,
            std::vector<std::string> cells) {
    cells.insert(cells.begin(), isText ? time.Plain(start) : time.Iso(start));
    if (!isText)
        cells.push_back(std::to_string(start));
    table.Add(cells);
}

Answer EpsByDevice(const EpsSeries &series, const Options &options, const TimeFormat &time) {
    const bool isText = options.format == "text";
    StatisticsTable table =
        TableOfTimes({{"time", false}, {"device", false}, {"count", true}, {"eps", true}}, isText);
    for (const auto &[start, bucket] : series.Buckets()) {
        for (const auto &[device, logs] : bucket.devices)
            AddRow(table, start, isText, time,
                   {device, std::to_string(logs), Rounded(series.PerSecond(logs))});
    }
    return {table, 2};
}

// The intervals of the period with and without records, up to now. Throws UsageError for too many.
std::map<int64_t, EpsBucket> WithEmpty(const EpsSeries &series, const Period &period, int64_t now) {
    constexpr int64_t kMost = 1'000'000;
    std::map<int64_t, EpsBucket> buckets = series.Buckets();
    if (!period.since && buckets.empty())
        return buckets;
    const int64_t first = period.since ? std::max<int64_t>(*period.since, 0) : buckets.begin()->first;
    const int64_t last = period.until.value_or(now);
    if ((last - first) / series.Seconds() > kMost)
        throw UsageError("--empty: more than " + std::to_string(kMost) +
                         " intervals; choose a longer one with --by, or a shorter period");
    // An hour may be longer or shorter where the clocks are set.
    for (int64_t start = series.StartOf(first); start <= last;
         start = series.StartOf(start + series.Seconds()))
        buckets[start];
    return buckets;
}

Answer Eps(const std::string &path, const Options &options) {
    const int64_t now = std::time(nullptr);
    const Period period = PeriodOf(options, now);
    const EpsSeries series = ReadSeries(path, options, period);
    const TimeFormat time(options.inUtc);
    if (options.perDevice)
        return EpsByDevice(series, options, time);
    const bool isText = options.format == "text";
    const std::map<int64_t, EpsBucket> buckets =
        options.hasEmpty ? WithEmpty(series, period, now) : series.Buckets();
    StatisticsTable table =
        TableOfTimes({{"time", false}, {"count", true}, {"eps", true}, {"peak", true}}, isText);
    int64_t expected = buckets.empty() ? 0 : buckets.begin()->first;
    for (const auto &[start, bucket] : buckets) {
        if (options.plot && start > expected)
            AddGap(table, expected, start, series, time);
        expected = start + series.Seconds();
        AddRow(table, start, isText, time,
               {std::to_string(bucket.logs), Rounded(series.PerSecond(bucket.logs)),
                std::to_string(bucket.peak)});
    }
    return {table, 1};
}

struct Question {
    const char *what;
    Answer (*ask)(const std::string &path, const Options &options);
};
constexpr Question kQuestions[] = {{"devices", Devices}, {"device", Device}, {"total", Total}, {"eps", Eps}};

const Question &QuestionOf(const Options &options) {
    for (const Question &question : kQuestions) {
        if (options.what == question.what)
            return question;
    }
    throw UsageError("stats: '" + options.what + "' is none of devices, device, total, eps, forget");
}

// Refuses an option that would silently do nothing.
void RequireSense(const Options &options, OutputFormat format) {
    const bool isEps = options.what == "eps";
    const auto belongsTo = [](const char *option, bool isGiven, bool fits, const char *what) {
        if (isGiven && !fits)
            throw UsageError(std::string(option) + ": goes with 'stats " + what + "' only");
    };
    belongsTo("--top", !options.top.empty(), options.what == "devices", "devices");
    belongsTo("--since", !options.period.since.empty(), isEps, "eps");
    belongsTo("--until", !options.period.until.empty(), isEps, "eps");
    belongsTo("--device", !options.device.empty(), isEps, "eps");
    belongsTo("--per-device", options.perDevice, isEps, "eps");
    belongsTo("--empty", options.hasEmpty, isEps, "eps");
    if (options.hasEmpty && options.perDevice)
        throw UsageError("--empty: goes not together with --per-device");
    const bool isDevice = options.what == "device";
    const bool isForget = options.what == "forget";
    belongsTo("NAME", !options.forget.names.empty(), isDevice || isForget, "device' and 'stats forget");
    belongsTo("--below", !options.forget.below.empty(), isForget, "forget");
    belongsTo("--dry-run", options.forget.isDryRun, isForget, "forget");
    belongsTo("--yes", options.forget.isConfirmed, isForget, "forget");
    if (isDevice && options.forget.names.size() != 1)
        throw UsageError("stats device: the name of a device is missing, or there are several");
    if (format == OutputFormat::Short)
        throw UsageError(
            "--output: statistics have no form 'short'; forms are text, json, jsonl, csv, spreadsheet");
    if (options.plot && format != OutputFormat::Text)
        throw UsageError("--plot: is text and goes with no other --output");
}

int Run(const Options &options, const std::string &root) {
    if (options.what == "forget") {
        ForgetOptions forget = options.forget;
        forget.format = ParseKeyValuesFormat(options.format);
        RequireSense(options, forget.format);
        return ForgetDevicesByOptions(AccountingPath(options.db, root), forget, root);
    }
    const Question &question = QuestionOf(options);
    const OutputFormat format = ParseOutputFormat(options.format);
    RequireSense(options, format);
    ApplyUtc(options.inUtc);
    std::setlocale(LC_CTYPE, "");
    const bool inUnicode = std::strcmp(nl_langinfo(CODESET), "UTF-8") == 0;
    std::setlocale(LC_CTYPE, "C");
    const auto [table, bar] = question.ask(AccountingPath(options.db, root), options);
    Output output(true);
    output.Write(options.plot ? table.Plot(bar, OutputWidth(), !options.noHeader, inUnicode)
                              : table.Write(format, !options.noHeader));
    output.Finish();
    return table.IsEmpty() ? kExitNothing : kExitFound;
}

} // namespace

void AddStats(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "stats", "Print how many logs were received",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    OfferWords(command.AddText("what", options->what, "", "devices, device, total, eps or forget"),
               {"devices", "device", "total", "eps", "forget"})
        .Required();
    command.AddArguments(
        "name", options->forget.names,
        "The device of 'stats device'; the devices of 'stats forget', with wildcards * and ?");
    command.AddText("--top", options->top, "N", "devices: the N that sent most");
    command.AddText("-S,--since", options->period.since, "TIME", "eps: from this time on");
    command.AddText("-U,--until", options->period.until, "TIME",
                    "eps: up to this second; a day alone ends before it begins");
    command.AddText("--below", options->forget.below, "N", "forget: only devices with fewer than N logs");
    command.AddFlag("--dry-run", options->forget.isDryRun, "forget: only tell how many devices match");
    command.AddFlag("-y,--yes", options->forget.isConfirmed, "forget: do not ask");
    OfferWords(
        command.AddText("--by", options->interval, "INTERVAL", "eps: second, minute (default) or hour"),
        {"second", "minute", "hour"});
    command.AddText("--device", options->device, "NAME", "eps: only of this device");
    command.AddFlag("--per-device", options->perDevice, "eps: a row for each device");
    command.AddFlag("--empty", options->hasEmpty, "eps: also the intervals of the period without logs");
    command.AddFlag("--plot", options->plot, "Draw the counts as bars");
    OfferWords(command.AddText("-o,--output", options->format, "FORMAT",
                               "text (default), json, jsonl, csv, spreadsheet (csv without formulas)"),
               {"text", "json", "jsonl", "csv", "spreadsheet"});
    command.AddFlag("--no-header", options->noHeader, "No heading in text, csv and spreadsheet");
    AddUtcOption(command, options->inUtc);
    command.AddText("--db", options->db, "PATH", "This accounting database");
}

} // namespace kelo::tool
