#include "cluster/server_answers.h"

namespace kelo::tool {

std::string NameOf(const EngineServers &servers, size_t server) {
    const std::string &url = servers.Url(server);
    return url.substr(url.find("://") + 3);
}

std::string AskOne(EngineServers &servers, size_t server, const std::string &statement) {
    const EngineServers::Rows rows = servers.Ask(server, statement);
    if (rows.size() != 1 || rows.front().size() != 1)
        throw DatabaseError(servers.Url(server) + ": no single value for " + statement);
    return rows.front().front();
}

std::string ReasonOf(const DatabaseError &error, const EngineServers &servers, size_t server) {
    const std::string text = error.what();
    const std::string name = servers.Url(server) + ": ";
    const size_t at = text.find(name);
    return at == std::string::npos ? text : text.substr(at + name.size());
}

} // namespace kelo::tool
