#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "cluster/engine_servers.h"

namespace kelo::tool {

// A day of records on one server, which is removed as a whole.
struct DayPartition {
    std::string name; // "20201122", by the time zone of the server
    uint64_t rows = 0;
    uint64_t bytes = 0; // on its disk
};

// The days of a server whose records were all received before `limit` (seconds since the epoch), oldest
// first. The records decide, not the name of a day. Throws DatabaseError.
std::vector<DayPartition> DaysBefore(EngineServers &servers, size_t server, int64_t limit);

// Where a server takes part in replication. Throws DatabaseError.
struct ReplicaRole {
    std::string shard; // the same for all replicas; "" without replication
    bool isLeader = true;
};
ReplicaRole RoleOf(EngineServers &servers, size_t server);

// Removes a day, from all replicas of the shard; only a leader can. One that is gone already is no error.
// Throws DatabaseError.
void DropDay(EngineServers &servers, size_t server, const std::string &name);

} // namespace kelo::tool
