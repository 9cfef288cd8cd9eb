#pragma once

#include <string>
#include <vector>

namespace kelo::tool {

// A log server that stores into a cluster.
struct LogServer {
    std::string host;
    size_t shard = 0; // the index of the one that gets its messages
};

// The servers of a cluster.
struct ClusterLayout {
    std::vector<std::vector<std::string>> shards; // the hosts of each; with several, each has all its rows
    std::vector<std::string> keepers;             // "host:port"; needed for several hosts in a shard
    std::vector<LogServer> logServers;
    std::vector<std::string> networks; // from which users may connect, besides the servers
    int httpPort = 8123;
    int nativePort = 9000;

    std::vector<std::string> Hosts() const;
};

// Options of the command line, as they were written.
struct ClusterLayoutOptions {
    std::vector<std::string> shards; // "HOST,HOST"
    std::vector<std::string> keepers;
    std::vector<std::string> logServers; // "HOST" or "HOST:SHARD"
    std::vector<std::string> networks;
    std::string httpPort;
    std::string nativePort;
};

// Log servers without a shard take the shards in turn. Throws UsageError, which names the option and the
// value, for a host that is none, a host that comes twice, shards of several hosts without a keeper, and a
// log server of a shard that is none.
ClusterLayout ReadClusterLayout(const ClusterLayoutOptions &options);

} // namespace kelo::tool
