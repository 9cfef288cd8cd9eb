#pragma once

#include <string>
#include <vector>

#include "cluster/engine_servers.h"

namespace kelo::tool {

// What is worth knowing about a server of a cluster.
struct ClusterFinding {
    enum class Level {
        kNote,    // what cannot be checked
        kWarning, // it works, and should be changed
        kError,   // it does not work as it should
    };
    std::string server; // its host and port
    Level level = Level::kError;
    std::string text; // one line
};

// Asks each server of a cluster whether it can be reached and is as "kelosyslog cluster init" sets it up:
// version, rights of the user, clock, tables, the servers that it knows, replicas, parts, free disk. Takes a
// second. The findings come in the order of the servers.
std::vector<ClusterFinding> CheckCluster(EngineServers &servers);

} // namespace kelo::tool
