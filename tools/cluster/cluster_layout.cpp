#include "cluster/cluster_layout.h"

#include <algorithm>
#include <charconv>

#include "base/errors.h"

namespace kelo::tool {
namespace {

constexpr int kMostPorts = 65535;
constexpr size_t kLongestName = 253;
constexpr size_t kMostLogServers = 255; // their numbers have 8 bits, and 0 is for records from elsewhere

bool IsOneOf(char byte, const char *others) {
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
           (byte != '\0' && std::string_view(others).find(byte) != std::string_view::npos);
}

// Names go into XML and SQL as they are.
void RequireName(const char *option, const std::string &text, const char *what, const char *others) {
    const bool isName =
        !text.empty() && text.size() <= kLongestName && IsOneOf(text.front(), "") &&
        std::all_of(text.begin(), text.end(), [&](char byte) { return IsOneOf(byte, others); });
    if (!isName)
        throw UsageError(std::string(option) + ": '" + text + "' is no " + what);
}

int NumberOf(const char *option, const std::string &text, const char *what, int most) {
    int number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end != text.data() + text.size() || number < 1 || number > most)
        throw UsageError(std::string(option) + ": '" + text + "' is no " + what + " from 1 to " +
                         std::to_string(most));
    return number;
}

int PortOf(const char *option, const std::string &text) {
    return NumberOf(option, text, "port", kMostPorts);
}

std::vector<std::string> SplitAtCommas(const std::string &text) {
    std::vector<std::string> parts(1);
    for (const char byte : text) {
        if (byte == ',')
            parts.emplace_back();
        else
            parts.back() += byte;
    }
    return parts;
}

std::string KeeperOf(const std::string &text) {
    const size_t colon = text.find(':');
    RequireName("--keeper", text.substr(0, colon), "name or IPv4 address of a host", ".-");
    if (colon != std::string::npos)
        PortOf("--keeper", text.substr(colon + 1));
    return colon != std::string::npos ? text : text + ":2181";
}

void AddLogServer(ClusterLayout &layout, const std::string &text) {
    constexpr char kOption[] = "--log-server";
    LogServer server{text.substr(0, text.find(':')), layout.logServers.size() % layout.shards.size()};
    RequireName(kOption, server.host, "name or IPv4 address of a host", ".-");
    if (server.host.size() < text.size())
        server.shard = static_cast<size_t>(NumberOf(kOption, text.substr(server.host.size() + 1), "shard",
                                                    static_cast<int>(layout.shards.size()))) -
                       1;
    for (const LogServer &known : layout.logServers) {
        if (known.host == server.host)
            throw UsageError(std::string(kOption) + ": '" + server.host + "' is there twice");
    }
    if (layout.logServers.size() == kMostLogServers)
        throw UsageError(std::string(kOption) + ": more than " + std::to_string(kMostLogServers) +
                         " log servers");
    layout.logServers.push_back(std::move(server));
}

} // namespace

std::vector<std::string> ClusterLayout::Hosts() const {
    std::vector<std::string> hosts;
    for (const std::vector<std::string> &shard : shards)
        hosts.insert(hosts.end(), shard.begin(), shard.end());
    return hosts;
}

ClusterLayout ReadClusterLayout(const ClusterLayoutOptions &options) {
    ClusterLayout layout;
    for (const std::string &shard : options.shards) {
        for (const std::string &host : SplitAtCommas(shard)) {
            RequireName("--shard", host, "name or IPv4 address of a host", ".-");
            const std::vector<std::string> known = layout.Hosts();
            if (std::find(known.begin(), known.end(), host) != known.end())
                throw UsageError("--shard: '" + host + "' is there twice");
            if (layout.shards.size() <= static_cast<size_t>(&shard - options.shards.data()))
                layout.shards.emplace_back();
            layout.shards.back().push_back(host);
        }
    }
    for (const std::string &keeper : options.keepers)
        layout.keepers.push_back(KeeperOf(keeper));
    for (const std::string &server : options.logServers)
        AddLogServer(layout, server);
    for (const std::string &network : options.networks) {
        RequireName("--network", network, "address or network like 192.0.2.0/24", ".:/");
        layout.networks.push_back(network);
    }
    if (!options.httpPort.empty())
        layout.httpPort = PortOf("--http-port", options.httpPort);
    if (!options.nativePort.empty())
        layout.nativePort = PortOf("--native-port", options.nativePort);
    const bool hasReplicas = layout.Hosts().size() > layout.shards.size();
    if (hasReplicas && layout.keepers.empty())
        throw UsageError("--shard: several hosts in a shard need --keeper, which keeps them in step");
    return layout;
}

} // namespace kelo::tool
