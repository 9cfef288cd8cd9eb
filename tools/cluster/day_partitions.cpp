#include "cluster/day_partitions.h"

#include <algorithm>
#include <set>

#include "base/number_text.h"

namespace kelo::tool {

std::vector<DayPartition> DaysBefore(EngineServers &servers, size_t server, int64_t limit) {
    // Asked first: what comes later is newer than the limit, and a day that it begins is not in the list.
    EngineServers::Rows days = servers.Ask(
        server,
        "SELECT partition, sum(rows), sum(bytes_on_disk) FROM system.parts WHERE active AND database = "
        "currentDatabase() AND table = 'logs_shard' GROUP BY partition ORDER BY partition");
    std::set<std::string> kept;
    for (const std::vector<std::string> &row :
         servers.Ask(server, "SELECT DISTINCT toString(toYYYYMMDD(toDateTime(utcsec))) FROM logs_shard WHERE "
                             "utcsec >= " +
                                 std::to_string(limit)))
        kept.insert(row.at(0));
    std::vector<DayPartition> old;
    for (const std::vector<std::string> &row : days) {
        if (!kept.contains(row.at(0)))
            old.push_back({row.at(0), UnsignedNumber(row.at(1)), UnsignedNumber(row.at(2))});
    }
    return old;
}

ReplicaRole RoleOf(EngineServers &servers, size_t server) {
    const EngineServers::Rows rows =
        servers.Ask(server, "SELECT zookeeper_path, is_leader FROM system.replicas WHERE database = "
                            "currentDatabase() AND table = 'logs_shard'");
    return rows.empty() ? ReplicaRole{} : ReplicaRole{rows[0].at(0), rows[0].at(1) == "1"};
}

void DropDay(EngineServers &servers, size_t server, const std::string &name) {
    const bool isDay = !name.empty() && std::all_of(name.begin(), name.end(),
                                                    [](char byte) { return byte >= '0' && byte <= '9'; });
    if (!isDay)
        throw DatabaseError("table logs_shard has no partition a day: '" + name + "'");
    servers.Run(server, "ALTER TABLE logs_shard DROP PARTITION " + name);
}

} // namespace kelo::tool
