#include "cluster/cluster_layout.h"

#include <algorithm>
#include <charconv>

#include "base/errors.h"

namespace kelo::tool {
namespace {

constexpr int kMostPorts = 65535;
constexpr size_t kLongestName = 253;

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

int PortOf(const char *option, const std::string &text) {
    int port = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), port);
    if (error != std::errc() || end != text.data() + text.size() || port < 1 || port > kMostPorts)
        throw UsageError(std::string(option) + ": '" + text + "' is no port from 1 to 65535");
    return port;
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
