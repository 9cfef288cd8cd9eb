// Deletion on all servers of a cluster.

#include <chrono>
#include <thread>

#include "cluster/cluster.h"

namespace kelo::platform {
namespace {

constexpr std::chrono::milliseconds kPause{20};

} // namespace

// A server removes rows after it has accepted the statement.
void Cluster::AwaitDeletion(const std::string &url) {
    using Clock = std::chrono::steady_clock;
    const Clock::time_point end = Clock::now() + std::chrono::seconds(configuration_.timeoutSec);
    const std::string sql = "SELECT count() FROM system.mutations WHERE database = '" +
                            configuration_.database + "' AND table = 'logs_shard' AND is_done = 0";
    for (;;) {
        std::string answer;
        Client().Run(url, configuration_.user, sql, [&](std::string_view part) { answer += part; });
        if (answer == "0\n")
            return;
        if (Clock::now() > end)
            throw ClusterError(KELO_FAILURE_BUSY, url + " still deletes after " +
                                                      std::to_string(configuration_.timeoutSec) +
                                                      " seconds, and goes on with it");
        std::this_thread::sleep_for(kPause);
    }
}

// Nothing is deleted unless all servers can be reached. The replicas of a shard all get the statement: for
// the second it has no rows left.
void Cluster::Delete(const Translation &rows) {
    const auto drop = [](std::string_view) {};
    for (const std::string &url : configuration_.urls)
        Client().Run(url, configuration_.user, "SELECT 1", drop);
    const std::string sql =
        "ALTER TABLE " + configuration_.database + ".logs_shard DELETE WHERE " + rows.where;
    for (const std::string &url : configuration_.urls)
        Client().Run(url, configuration_.user, sql, drop);
    for (const std::string &url : configuration_.urls)
        AwaitDeletion(url);
}

} // namespace kelo::platform
