#pragma once

#include <string>

#include "cluster/engine_servers.h"

namespace kelo::tool {

// What the commands for one server at a time need besides EngineServers.

// The host and port of a server.
std::string NameOf(const EngineServers &servers, size_t server);

// The only value of an answer of one row and one column. Throws DatabaseError.
std::string AskOne(EngineServers &servers, size_t server, const std::string &statement);

// The text of an error that EngineServers threw for a server, without the names of description and server.
std::string ReasonOf(const DatabaseError &error, const EngineServers &servers, size_t server);

} // namespace kelo::tool
