// kelosyslog cluster retention: removes the days of a cluster that are too old.

#include <ctime>
#include <set>

#include "base/errors.h"
#include "cli/confirm.h"
#include "cli/exit_status.h"
#include "cluster/day_partitions.h"
#include "cluster/server_answers.h"
#include "commands/cluster_commands.h"
#include "commands/common_options.h"
#include "print/action_lines.h"
#include "read/time_expression.h"
#include "status/figures.h"

namespace kelo::tool {
namespace {

constexpr const char *kFooter =
    "Removes whole days on every server, from all replicas: at no cost, and only days without a record that "
    "is\n"
    "younger than --keep. The description is one of a user who may change the tables, cluster-admin.conf.\n\n"
    "Examples:\n"
    "  kelosyslog cluster retention /etc/kelosyslog/cluster-admin.conf --keep 90d --dry-run\n"
    "  kelosyslog cluster retention /etc/kelosyslog/cluster-admin.conf --keep 90d --yes\n\n"
    "Exit status: 0 done or to be done, 1 nothing to do or not confirmed, 2 usage, 3 the description, or a\n"
    "server is away or refuses, 4 output.";

constexpr int64_t kDaySec = 86400;

constexpr char kDescription[] = "FILE";

struct Options {
    std::string description;
    std::string keep;
    std::string format = "text";
    bool isDryRun = false;
    bool isConfirmed = false;
};

int64_t LimitOf(const std::string &keep) {
    const std::optional<int64_t> seconds = ParseTimeSpan(keep);
    const int64_t now = std::time(nullptr);
    if (!seconds || *seconds >= now)
        throw UsageError("--keep: '" + keep + "' is no age; write for example 90d");
    if (*seconds < kDaySec)
        throw UsageError("--keep: '" + keep + "' would remove what has just arrived; the least is 1d");
    return now - *seconds;
}

struct OldDay {
    size_t server;
    DayPartition day;
};

class Removal {
public:
    explicit Removal(const std::string &description) : servers_(description, kDescription) {}

    // Of replicas one that leads is asked; it removes a day from all.
    void Plan(int64_t limit) {
        std::set<std::string> shards;
        std::set<std::string> ledShards;
        for (size_t i = 0; i < servers_.Count(); ++i) {
            Try(i, [&] {
                const ReplicaRole role = RoleOf(servers_, i);
                shards.insert(role.shard);
                if (!role.isLeader || (!ledShards.insert(role.shard).second && !role.shard.empty()))
                    return;
                for (const DayPartition &day : DaysBefore(servers_, i, limit))
                    days_.push_back({i, day});
            });
        }
        for (const std::string &shard : shards) {
            if (!ledShards.contains(shard))
                AddFailure(shard + ": no server of the description leads its replicas");
        }
    }

    const std::vector<OldDay> &Days() const { return days_; }
    std::string Text(const OldDay &old) const {
        return NameOf(servers_, old.server) + ": day " + old.day.name + ", " + Counted(old.day.rows, "row") +
               ", " + Bytes(static_cast<int64_t>(old.day.bytes));
    }

    void Execute(ActionLines &lines) {
        for (const OldDay &old : days_) {
            Try(old.server, [&] {
                DropDay(servers_, old.server, old.day.name);
                lines.Add("removed " + Text(old));
            });
        }
    }

    // Throws DatabaseError for the servers that failed.
    void RequireNoFailure() const {
        if (!failures_.empty())
            throw DatabaseError(failures_);
    }

private:
    void AddFailure(const std::string &text) { failures_ += (failures_.empty() ? "" : "; ") + text; }

    // A server that fails does not keep the others from it, and is left alone.
    template <typename Work>
    void Try(size_t server, const Work &work) {
        if (failed_.contains(server))
            return;
        try {
            work();
        } catch (const DatabaseError &error) {
            AddFailure(NameOf(servers_, server) + ": " + ReasonOf(error, servers_, server));
            failed_.insert(server);
        }
    }

    EngineServers servers_;
    std::vector<OldDay> days_;
    std::set<size_t> failed_;
    std::string failures_;
};

int Run(const Options &options) {
    if (options.keep.empty())
        throw UsageError("cluster retention: no --keep");
    const int64_t limit = LimitOf(options.keep);
    ActionLines lines(ParseKeyValuesFormat(options.format));
    Removal removal(options.description);
    removal.Plan(limit);
    const bool isEmpty = removal.Days().empty();
    if (options.isDryRun || !options.isConfirmed) {
        for (const OldDay &old : removal.Days())
            lines.Add("would remove " + removal.Text(old));
    }
    if (!options.isDryRun && !isEmpty) {
        if (!options.isConfirmed && !Confirm("cluster retention", "do so")) {
            PrintMessage("nothing done");
            lines.End();
            return kExitNothing;
        }
        removal.Execute(lines);
    }
    lines.End();
    removal.RequireNoFailure();
    return isEmpty ? kExitNothing : kExitFound;
}

} // namespace

void AddClusterRetention(Program &program, Command cluster) {
    auto options = std::make_shared<Options>();
    Command command =
        AddSubcommand(program, cluster, "retention", "Remove the days of a cluster that are too old",
                      [options] { return Run(*options); });
    command.Footer(kFooter);
    command.AddText("description", options->description, kDescription, "The description of the cluster")
        .Required();
    command.AddText("--keep", options->keep, "AGE", "Remove days that are older as a whole, for example 90d");
    command.AddFlag("--dry-run", options->isDryRun, "Only tell what would be done");
    command.AddFlag("-y,--yes", options->isConfirmed, "Do not ask");
    AddKeyValuesFormat(command, options->format);
}

} // namespace kelo::tool
