#include "cluster/cluster_check.h"

#include <cstdio>
#include <cstdlib>
#include <ctime>

#include "base/number_text.h"
#include "cluster/clock_check.h"
#include "cluster/server_answers.h"
#include "cluster/table_check.h"

namespace kelo::tool {
namespace {

using Level = ClusterFinding::Level;

constexpr uint64_t kManyParts = 150; // of a day; the engine slows inserts down
constexpr uint64_t kMostParts = 300; // it refuses them
constexpr uint64_t kLongDelaySec = 60;
constexpr double kLittleDisk = 0.1;
constexpr double kLeastDisk = 0.03;
constexpr int kYearsOfVersion = 2;

// The checks of one server. Each throws DatabaseError where it does not answer.
class ServerCheck {
public:
    ServerCheck(EngineServers &servers, size_t server, std::vector<ClusterFinding> &findings)
        : servers_(servers), server_(server), findings_(findings) {}

    void Note(Level level, const std::string &text) {
        findings_.push_back({NameOf(servers_, server_), level, text});
    }

    // Versions are named after their years.
    void CheckVersion(std::string &first) {
        const std::string version = AskOne(servers_, server_, "SELECT version()");
        if (first.empty())
            first = version;
        if (version != first)
            Note(Level::kWarning, "version " + version + " differs from " + first + " of another server");
        const std::time_t now = std::time(nullptr);
        std::tm today{};
        gmtime_r(&now, &today);
        if (today.tm_year - 100 - std::atoi(version.c_str()) >= kYearsOfVersion)
            Note(Level::kWarning, "version " + version + " is old; take one that is maintained");
    }

    void CheckRights() {
        const std::string readonly =
            AskOne(servers_, server_, "SELECT value FROM system.settings WHERE name = 'readonly'");
        if (readonly != "1")
            Note(Level::kError,
                 "the user of the description may do more than read (readonly is " + readonly + ")");
    }

    void CheckTables() {
        for (const std::string &problem : FindTableProblems(servers_, server_))
            Note(Level::kError, problem);
    }

    // The servers that it knows must be those that the others know, `first`.
    void CheckServers(EngineServers::Rows &first) {
        const EngineServers::Rows known = servers_.Ask(
            server_, "SELECT shard_num, host_name, port FROM system.clusters WHERE cluster = 'kelo' ORDER BY "
                     "shard_num, host_name, port");
        if (first.empty())
            first = known;
        if (known.empty())
            Note(Level::kError, "it knows no cluster 'kelo'");
        else if (known != first)
            Note(Level::kError, "its remote_servers differ from those of another server");
        else if (known.size() != servers_.Count())
            Note(Level::kWarning, "it knows " + std::to_string(known.size()) +
                                      " servers of the cluster, and the description has " +
                                      std::to_string(servers_.Count()));
    }

    void CheckReplicas() {
        for (const std::vector<std::string> &row : servers_.Ask(
                 server_, "SELECT is_readonly OR is_session_expired, absolute_delay, active_replicas, "
                          "total_replicas, queue_size FROM system.replicas WHERE database = "
                          "currentDatabase() AND table = "
                          "'logs_shard'")) {
            if (row[0] != "0")
                Note(Level::kError, "it takes no rows, as it has no connection to ZooKeeper");
            if (UnsignedNumber(row[1]) > kLongDelaySec)
                Note(Level::kError,
                     "it is " + row[1] + " s behind the other replicas, with " + row[4] + " tasks to do");
            if (row[2] != row[3])
                Note(Level::kError, "only " + row[2] + " of " + row[3] + " replicas of its shard are active");
        }
    }

    void CheckParts() {
        for (const std::vector<std::string> &row : servers_.Ask(
                 server_, "SELECT partition, count() AS parts FROM system.parts WHERE active AND database = "
                          "currentDatabase() AND table = 'logs_shard' GROUP BY partition ORDER BY parts DESC "
                          "LIMIT 1")) {
            const uint64_t parts = UnsignedNumber(row[1]);
            if (parts >= kManyParts)
                Note(parts >= kMostParts ? Level::kError : Level::kWarning,
                     "the day " + row[0] + " has " + row[1] + " parts; from " + std::to_string(kMostParts) +
                         " on rows are refused: send larger batches");
        }
    }

    void CheckDisk() {
        const bool isKnown = AskOne(servers_, server_,
                                    "SELECT count() FROM system.tables WHERE database = 'system' "
                                    "AND name = 'disks'") != "0";
        if (!isKnown)
            return Note(Level::kNote, "this version does not say how much disk is free");
        for (const std::vector<std::string> &row :
             servers_.Ask(server_, "SELECT name, free_space, total_space FROM system.disks")) {
            const double free =
                static_cast<double>(UnsignedNumber(row[1])) / static_cast<double>(UnsignedNumber(row[2]));
            char percent[16];
            std::snprintf(percent, sizeof percent, "%.1f %%", free * 100);
            if (free < kLittleDisk)
                Note(free < kLeastDisk ? Level::kError : Level::kWarning,
                     "only " + std::string(percent) + " of the disk '" + row[0] + "' are free");
        }
    }

private:
    EngineServers &servers_;
    size_t server_;
    std::vector<ClusterFinding> &findings_;
};

} // namespace

std::vector<ClusterFinding> CheckCluster(EngineServers &servers) {
    std::vector<ClusterFinding> findings;
    std::string version;
    EngineServers::Rows known;
    const std::vector<ClockOffset> offsets = ClockOffsets(servers);
    const std::vector<std::pair<size_t, double>> wrong = WrongClocks(offsets);
    for (size_t i = 0; i < servers.Count(); ++i) {
        ServerCheck check(servers, i, findings);
        try {
            check.CheckVersion(version);
            for (const auto &[server, seconds] : wrong) {
                char text[64];
                std::snprintf(text, sizeof text, "its clock is %.1f s %s", std::abs(seconds),
                              seconds > 0 ? "ahead" : "behind");
                if (server == i)
                    check.Note(Level::kError, text);
            }
            check.CheckRights();
            check.CheckTables();
            check.CheckServers(known);
            check.CheckReplicas();
            check.CheckParts();
            check.CheckDisk();
        } catch (const DatabaseError &error) {
            check.Note(Level::kError, ReasonOf(error, servers, i));
        }
    }
    return findings;
}

} // namespace kelo::tool
