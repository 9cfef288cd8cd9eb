// kelosyslog search: prints records.

#include <ctime>
#include <limits>

#include "base/errors.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "commands/follow.h"
#include "commands/index_upkeep.h"
#include "read/log_reader.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "Logs are printed in the order in which they arrived, oldest first. Without -n all are printed;\n"
    "-n takes the newest, or with --oldest the oldest.\n\n"
    "To page through logs while more arrive, ask for those before the smallest id of the page before:\n"
    "ids stay, while --offset counts from a newest log that changes. The logs around log 4711 are\n"
    "--before-id 4712 -n 10 and --after-id 4711 --oldest -n 10.\n\n"
    "Examples:\n"
    "  kelosyslog search -n 20                              the newest 20 logs\n"
    "  kelosyslog search -p err --since yesterday           errors and worse since yesterday\n"
    "  kelosyslog search -H 'nas*,!nas3' -g 'disk -smart'   all NAS but one, \"disk\" without \"smart\"\n"
    "  kelosyslog search -p '!debug' -f                     follow, without debug logs\n"
    "  kelosyslog search -p err -n 100 --before-id 4711     the page before log 4711\n"
    "  kelosyslog search --log smbxfer -n 50 -r             the newest file transfers first\n"
    "  kelosyslog search --since today -o csv > today.csv   everything of today, for a spreadsheet\n\n"
    "Exit status: 0 found, 1 nothing matched, 2 usage, 3 database, 4 output.";

// A page and its sum stay below what one statement can skip.
constexpr uint64_t kMaxLines = 2000000000;
constexpr uint64_t kMaxId = std::numeric_limits<int64_t>::max();

struct Options {
    LogTableOptions table;
    LogFilter filter;
    OutputOptions output;
    std::string lines;
    std::string offset;
    std::string beforeId;
    std::string afterId;
    std::string idle;
    std::string maxMessage;
    bool fromOldest = false;
    bool newestFirst = false;
    bool follow = false;
};

uint64_t FirstId(const Options &options) {
    return options.afterId.empty() ? 1 : ParseNumber("--after-id", options.afterId, 0, kMaxId) + 1;
}

Page ParsePage(const Options &options) {
    Page page;
    if (!options.lines.empty() && options.lines != "all")
        page.limit = ParseNumber("--lines", options.lines, 1, kMaxLines);
    if (!options.offset.empty())
        page.offset = ParseNumber("--offset", options.offset, 0, kMaxLines);
    if (!options.beforeId.empty())
        page.range.last = ParseNumber("--before-id", options.beforeId, 1, kMaxId) - 1;
    page.range.first = FirstId(options);
    page.fromOldest = options.fromOldest;
    return page;
}

FollowOptions ParseFollow(const Options &options, int64_t now) {
    if (options.newestFirst || options.fromOldest || !options.offset.empty() || !options.beforeId.empty())
        throw UsageError("--follow: goes neither with --reverse, --oldest, --offset nor --before-id");
    FollowOptions follow;
    follow.showAll = options.lines == "all" ||
                     (options.lines.empty() && !(options.filter.since + options.afterId).empty());
    follow.firstId = FirstId(options);
    if (!options.lines.empty() && options.lines != "all")
        follow.lines = ParseNumber("--lines", options.lines, 0, kMaxLines);
    if (!options.idle.empty())
        follow.idleSec = ParseNumber("--idle", options.idle, 0, kMaxLines);
    follow.until = LastSecond(options.filter, now);
    return follow;
}

int Run(const Options &options, const std::string &root) {
    ApplyUtc(options.output.inUtc);
    const int64_t now = std::time(nullptr);
    if (!options.follow && !options.idle.empty())
        throw UsageError("--idle: only together with --follow");
    const Page page = options.follow ? Page{} : ParsePage(options);
    const FollowOptions follow = options.follow ? ParseFollow(options, now) : FollowOptions{};
    const LogTable table = ResolveLogTable(options.table, root);
    RecordLayout layout = MakeLayout(options.output, table.kind);
    if (!options.maxMessage.empty())
        layout.maxMessage = ParseNumber("--max-message", options.maxMessage, 0, kMaxLines);
    const LogReader reader(table, MakeConditions(options.filter, table, now));

    Output output(!options.follow && !options.output.noPager);
    const std::unique_ptr<RecordFormatter> writer = MakeRecordWriter(layout);
    std::string text;
    writer->Begin(text);
    const auto format = [&](const _SYSLOG_LOG_DATA_tag &log) { writer->Add(log, text); };
    const auto print = [&] {
        output.Write(text);
        text.clear();
    };
    const uint64_t count = options.follow ? Follow(reader, follow, format, print, output)
                                          : reader.ReadPage(page, !options.newestFirst, format, print);
    writer->End(text);
    print();
    output.Finish();
    if (!options.filter.keywords.empty() && !options.follow)
        ExtendIndexLater(table);
    return count > 0 ? kExitFound : kExitNothing;
}

} // namespace

void AddSearch(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "search", "Print logs",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    AddFilterOptions(command, options->filter);
    const std::string group = "How many";
    command.AddText("-n,--lines", options->lines, "N", "The newest N logs, or 'all'").Group(group);
    command.AddText("--offset", options->offset, "N", "Skip the N newest logs first").Group(group);
    command
        .AddText("--before-id", options->beforeId, "ID", "Only logs that arrived before the log with this id")
        .Group(group);
    command.AddText("--after-id", options->afterId, "ID", "Only logs that arrived after the log with this id")
        .Group(group);
    command.AddFlag("--oldest", options->fromOldest, "-n and --offset count from the oldest log")
        .Group(group);
    command.AddFlag("-r,--reverse", options->newestFirst, "Newest first").Group(group);
    command
        .AddFlag("-f,--follow", options->follow,
                 "Print the newest 10 logs (or -n; all with --since or --after-id) and then what arrives, "
                 "until --until "
                 "has passed, --idle has, or nobody reads any more")
        .Group(group);
    command.AddText("--idle", options->idle, "SECONDS", "Stop following after SECONDS without a new log")
        .Group(group);
    AddOutputOptions(command, options->output);
    command
        .AddText("--max-message", options->maxMessage, "N",
                 "Cut messages to N bytes, at a whole character; in json 'length' is the length of all of it")
        .Group("How to print");
    AddTableOptions(command, options->table);
    AddPartialOption(command, options->table);
}

} // namespace kelo::tool
