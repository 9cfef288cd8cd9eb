// kelosyslog cluster check and status: whether the servers of a cluster work as they should, and what they
// hold.

#include "cluster/cluster_state.h"

#include <algorithm>
#include <cstdio>
#include <ctime>

#include "base/json.h"
#include "base/time_format.h"
#include "cli/exit_status.h"
#include "cluster/cluster_check.h"
#include "commands/cluster_commands.h"
#include "commands/common_options.h"
#include "print/statistics_table.h"
#include "status/figures.h"

namespace kelo::tool {
namespace {

constexpr const char *kCheckFooter =
    "Looks at each server of the description: whether it answers, its version, that the user may only read, "
    "its\nclock, its tables, the servers that it knows, its replicas, its parts and its disk. Each finding "
    "is "
    "a line.\n\n"
    "Examples:\n"
    "  kelosyslog cluster check /etc/kelosyslog/cluster.conf\n\n"
    "Exit status: 0 no error (notes and warnings do not count), 1 an error, 2 usage, 3 the description, 4 "
    "output.";
constexpr const char *kStatusFooter =
    "Shows the records and bytes of each server of the description, how many records a second came in the "
    "last\nminute, and how old the newest one is; and the same of each log server that sent something within "
    "a day,\nby its number.\n\n"
    "Examples:\n"
    "  kelosyslog cluster status /etc/kelosyslog/cluster.conf\n\n"
    "Exit status: 0 all servers answer, 1 a server is away, 2 usage, 3 none answers, or the description, 4 "
    "output.";

constexpr char kDescription[] = "FILE";

struct Options {
    std::string description;
    std::string format = "text";
    bool inUtc = false;
};

constexpr const char *kLevels[] = {"note", "warning", "error"};

const char *NameOf(ClusterFinding::Level level) {
    return kLevels[static_cast<size_t>(level)];
}

std::string CheckText(const std::vector<ClusterFinding> &findings, size_t servers) {
    std::string text;
    size_t counts[std::size(kLevels)] = {};
    for (const ClusterFinding &finding : findings) {
        text += finding.server + ": " + NameOf(finding.level) + ": " + finding.text + "\n";
        ++counts[static_cast<size_t>(finding.level)];
    }
    return text + Counted(servers, "server") + ": " + Counted(counts[2], "error") + ", " +
           Counted(counts[1], "warning") + ", " + Counted(counts[0], "note") + "\n";
}

std::string CheckJson(const std::vector<ClusterFinding> &findings, size_t servers) {
    std::string text;
    std::string items;
    JsonLines lines(true);
    lines.Begin(items);
    for (const ClusterFinding &finding : findings) {
        lines.BeginItem(items);
        JsonObject item(items);
        item.Add("server", finding.server);
        item.Add("level", NameOf(finding.level));
        item.Add("text", finding.text);
        item.End();
    }
    lines.End(items);
    items.pop_back(); // the line feed
    JsonObject object(text);
    object.AddJson("servers", std::to_string(servers));
    object.AddJson("findings", items);
    object.End();
    return text + "\n";
}

void Show(const std::string &text) {
    Output output(false);
    output.Write(text);
    output.Finish();
}

int Check(const Options &options) {
    const OutputFormat format = ParseKeyValuesFormat(options.format);
    EngineServers servers(options.description, kDescription);
    const std::vector<ClusterFinding> findings = CheckCluster(servers);
    const size_t count = servers.Count();
    Show(format == OutputFormat::Json ? CheckJson(findings, count) : CheckText(findings, count));
    const bool isWrong = std::any_of(findings.begin(), findings.end(), [](const ClusterFinding &finding) {
        return finding.level == ClusterFinding::Level::kError;
    });
    return isWrong ? kExitNothing : kExitFound;
}

std::string Rate(double perSec) {
    char text[32];
    std::snprintf(text, sizeof text, "%.1f", perSec);
    return text;
}

// "-" in text and null in JSON for what is unknown.
std::string ServersTable(const ClusterState &state, int64_t now, const TimeFormat &times,
                         OutputFormat format) {
    const bool isJson = format == OutputFormat::Json;
    StatisticsTable table({{"server", false},
                           {"shard", false},
                           {"rows", true},
                           {"bytes", true},
                           {isJson ? "rows_per_second" : "rows/s", true},
                           {"age", true},
                           {"newest", false}});
    const std::string unknown = isJson ? "null" : "-";
    for (const ClusterServerState &server : state.servers) {
        const bool isAway = !server.problem.empty();
        const auto bytes = static_cast<int64_t>(server.bytes);
        const int64_t age = now - server.newest.value_or(now);
        table.Add({server.name, server.shard,
                   isAway   ? unknown
                   : isJson ? std::to_string(server.rows)
                            : Grouped(server.rows),
                   isAway   ? unknown
                   : isJson ? std::to_string(bytes)
                            : Bytes(bytes),
                   isAway ? unknown : Rate(server.perSec),
                   !server.newest ? unknown
                   : isJson       ? std::to_string(age)
                                  : Duration(age),
                   isAway          ? "away"
                   : server.newest ? times.Plain(*server.newest)
                                   : "-"});
    }
    return table.Write(format, true);
}

std::string LogServersTable(const ClusterState &state, int64_t now, const TimeFormat &times,
                            OutputFormat format) {
    const bool isJson = format == OutputFormat::Json;
    StatisticsTable table({{isJson ? "log_server" : "log server", true},
                           {isJson ? "rows_per_second" : "rows/s", true},
                           {"age", true},
                           {"newest", false}});
    for (const LogServerState &server : state.logServers) {
        const int64_t age = now - server.newest;
        table.Add({std::to_string(server.node), Rate(server.perSec),
                   isJson ? std::to_string(age) : Duration(age), times.Plain(server.newest)});
    }
    return table.Write(format, true);
}

int Status(const Options &options) {
    const OutputFormat format = ParseKeyValuesFormat(options.format);
    const TimeFormat times(options.inUtc);
    EngineServers servers(options.description, kDescription);
    const int64_t now = std::time(nullptr);
    const ClusterState state = GatherClusterState(servers, now);
    std::string away;
    size_t awayCount = 0;
    for (const ClusterServerState &server : state.servers) {
        awayCount += server.problem.empty() ? 0 : 1;
        if (!server.problem.empty())
            away += "! " + server.name + " is away: " + server.problem + "\n";
    }
    std::string holders = ServersTable(state, now, times, format);
    const std::string senders = LogServersTable(state, now, times, format);
    if (format == OutputFormat::Json) {
        holders.pop_back(); // the line feeds
        Show("{\"servers\":" + holders + ",\"log_servers\":" + senders.substr(0, senders.size() - 1) + "}\n");
    } else {
        Show(away + holders + (senders.empty() ? "" : "\n" + senders));
    }
    return awayCount == 0 ? kExitFound : awayCount < state.servers.size() ? kExitNothing : kExitDatabase;
}

} // namespace

void AddClusterState(Program &program, Command cluster) {
    auto options = std::make_shared<Options>();
    const auto add = [&](const char *name, const char *description, const char *footer,
                         int (*run)(const Options &)) {
        Command command =
            AddSubcommand(program, cluster, name, description, [options, run] { return run(*options); });
        command.Footer(footer);
        command.AddText("description", options->description, kDescription, "The description of the cluster")
            .Required();
        AddKeyValuesFormat(command, options->format);
        return command;
    };
    add("check", "Check the servers of a running cluster", kCheckFooter, Check);
    AddUtcOption(add("status", "Show what the servers of a cluster hold", kStatusFooter, Status),
                 options->inUtc);
}

} // namespace kelo::tool
