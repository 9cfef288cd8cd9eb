#include "cluster/cluster_state.h"

#include <algorithm>
#include <map>

#include "base/number_text.h"
#include "cluster/server_answers.h"

#include "keloplatform/cluster.h"

namespace kelo::tool {
namespace {

constexpr int64_t kLatelySec = 60;
constexpr int64_t kRecentSec = 86400;

// The replicas of a shard have the same rows of a log server, but for what one of them still lacks.
void TakeLogServer(const LogServerState &found, std::map<int, LogServerState> &logServers) {
    LogServerState &known = logServers[found.node];
    known.node = found.node;
    known.perSec = std::max(known.perSec, found.perSec);
    known.newest = std::max(known.newest, found.newest);
}

void AskServer(EngineServers &servers, size_t server, int64_t now, ClusterServerState &state,
               std::map<int, LogServerState> &logServers) {
    const std::vector<std::string> held =
        servers
            .Ask(server, "SELECT sum(rows), sum(bytes_on_disk) FROM system.parts WHERE active AND database = "
                         "currentDatabase() AND table = 'logs_shard'")
            .at(0);
    state.rows = UnsignedNumber(held.at(0));
    state.bytes = UnsignedNumber(held.at(1));
    for (const std::vector<std::string> &row :
         servers.Ask(server, "SELECT substitution FROM system.macros WHERE macro = 'shard'"))
        state.shard = row.at(0);
    // The rows are in the order of their ids, so that the older ones are not read.
    const int64_t firstId = (now - kRecentSec) << KELODB_CLUSTER_BITS_BELOW_SECOND;
    for (const std::vector<std::string> &row :
         servers.Ask(server, "SELECT node, countIf(utcsec > " + std::to_string(now - kLatelySec) +
                                 "), max(utcsec) FROM logs_shard WHERE id >= " + std::to_string(firstId) +
                                 " GROUP BY node")) {
        const double perSec = static_cast<double>(SignedNumber(row.at(1))) / kLatelySec;
        const int64_t newest = SignedNumber(row.at(2));
        state.perSec += perSec;
        state.newest = std::max(state.newest.value_or(newest), newest);
        TakeLogServer({static_cast<int>(SignedNumber(row.at(0))), perSec, newest}, logServers);
    }
    if (!state.newest && state.rows > 0)
        state.newest = SignedNumber(AskOne(servers, server, "SELECT max(utcsec) FROM logs_shard"));
}

} // namespace

ClusterState GatherClusterState(EngineServers &servers, int64_t now) {
    ClusterState state;
    std::map<int, LogServerState> logServers;
    for (size_t i = 0; i < servers.Count(); ++i) {
        ClusterServerState one;
        try {
            AskServer(servers, i, now, one, logServers);
        } catch (const DatabaseError &error) {
            one = {};
            one.problem = ReasonOf(error, servers, i);
        }
        one.name = NameOf(servers, i);
        state.servers.push_back(one);
    }
    for (const auto &[node, logServer] : logServers)
        state.logServers.push_back(logServer);
    return state;
}

} // namespace kelo::tool
