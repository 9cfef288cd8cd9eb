#pragma once

#include <string>
#include <vector>

#include "cluster/engine_servers.h"

namespace kelo::tool {

// A column of a table that schema/cluster.sql creates.
struct ClusterColumn {
    std::string table;
    std::string name;
    std::string type;
};
std::vector<ClusterColumn> ClusterColumns();

// In what the tables of a server differ from schema/cluster.sql, a line each. Throws DatabaseError.
std::vector<std::string> FindTableProblems(EngineServers &servers, size_t server);

} // namespace kelo::tool
