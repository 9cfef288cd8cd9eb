#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "cluster/engine_servers.h"

namespace kelo::tool {

// What a server of a cluster holds.
struct ClusterServerState {
    std::string name;
    std::string problem; // why it is away; then the rest is empty
    std::string shard;
    uint64_t rows = 0;
    uint64_t bytes = 0;            // on its disk
    double perSec = 0;             // rows a second in the last minute
    std::optional<int64_t> newest; // when the newest message was received, in seconds since the epoch
};

// What a log server has sent lately: within a day.
struct LogServerState {
    int node = 0; // its number in the cluster
    double perSec = 0;
    int64_t newest = 0;
};

struct ClusterState {
    std::vector<ClusterServerState> servers;
    std::vector<LogServerState> logServers; // in the order of their numbers
};

// Asks each server. `now` is the present in seconds since the epoch.
ClusterState GatherClusterState(EngineServers &servers, int64_t now);

} // namespace kelo::tool
