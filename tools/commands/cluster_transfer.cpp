// kelosyslog cluster import, export: moves records into a cluster and out of it.

#include "commands/cluster_transfer.h"

#include <csignal>
#include <filesystem>

#include "base/errors.h"
#include "base/stop_signals.h"
#include "cli/exit_status.h"
#include "cli/progress_bar.h"
#include "cluster/cluster_export.h"
#include "cluster/cluster_import.h"
#include "commands/common_options.h"

namespace kelo::tool {
namespace {

constexpr const char *kImportFooter =
    "Stores what the cluster lacks of table logs of the databases, and compares number and checksums of all\n"
    "their records with what it has then. Run it again after an interruption, or for new records: what is\n"
    "there already is not sent. One log and its archives always have the same --node.\n\n"
    "Examples:\n"
    "  kelosyslog cluster import /var/log/kelosyslog/logs.db --node 200 --db cluster-admin.conf\n"
    "  kelosyslog cluster import /srv/archive/*.db --node 200 --db cluster-admin.conf\n\n"
    "Exit status: 0 all records are in the cluster, 1 the databases have none, 2 usage, 3 database or "
    "cluster.";

constexpr const char *kExportFooter =
    "Stores what the database lacks of the records of the cluster, and compares number and checksums of all\n"
    "with what it has then. Run it again after an interruption, or for new records.\n\n"
    "Example:\n"
    "  kelosyslog cluster export /srv/logs.db --db /etc/kelosyslog/cluster.conf\n\n"
    "Exit status: 0 all records are in the database, 1 the cluster has none, 2 usage, 3 database or cluster.";

constexpr unsigned int kMaxNode = 255;
constexpr const char *kComparison = "number of records and checksums, of every block on both sides";

struct Options {
    std::vector<std::string> databases;
    std::string cluster;
    std::string node;
    std::string format = "text";
};

// Shows how far a transfer is.
class Progress {
public:
    void operator()(uint64_t total, uint64_t done) {
        if (bar_ == nullptr)
            bar_ = std::make_unique<ProgressBar>(total, ProgressBar::Unit::Records);
        bar_->Add(done - shown_);
        shown_ = done;
    }

private:
    std::unique_ptr<ProgressBar> bar_;
    uint64_t shown_ = 0;
};

// What was done so far stays; the next run goes on.
template <typename Work>
int Interruptible(Work work) {
    try {
        const StopSignals signals;
        return work();
    } catch (const Interrupted &interruption) {
        std::raise(interruption.signal);
        return kExitSystem;
    }
}

void RequireClusterOption(const Options &options) {
    if (options.cluster.empty())
        throw UsageError("--db: the description of the cluster is missing");
}

std::string AbsolutePath(const std::string &path) {
    return path.empty() ? path : std::filesystem::absolute(path).string();
}

int Import(const Options &options) {
    RequireClusterOption(options);
    if (options.node.empty())
        throw UsageError("--node: the number of the log server for these records is missing");
    const auto node = static_cast<unsigned int>(ParseNumber("--node", options.node, 0, kMaxNode));
    const OutputFormat format = ParseKeyValuesFormat(options.format);
    for (const std::string &database : options.databases)
        RequireDatabase(AbsolutePath(database), "cluster import");
    ClusterImportResult sum;
    for (const std::string &database : options.databases) {
        Progress progress;
        const ClusterImportResult result =
            ImportIntoCluster({AbsolutePath(database), options.cluster, node, std::ref(progress)});
        sum.rows += result.rows;
        sum.sent += result.sent;
        sum.nulls += result.nulls;
        sum.wrongTimes += result.wrongTimes;
    }
    KeyValues values;
    values.Add("records", static_cast<int64_t>(sum.rows));
    values.Add("sent", static_cast<int64_t>(sum.sent));
    values.Add("null_values", static_cast<int64_t>(sum.nulls));
    values.Add("wrong_times", static_cast<int64_t>(sum.wrongTimes));
    values.Add("compared", kComparison);
    Print(values, format);
    return sum.rows > 0 ? kExitFound : kExitNothing;
}

int Export(const Options &options) {
    RequireClusterOption(options);
    const OutputFormat format = ParseKeyValuesFormat(options.format);
    const std::string database = AbsolutePath(options.databases.front());
    RequireDatabase(database, "cluster export");
    Progress progress;
    const ClusterExportResult result = ExportFromCluster({options.cluster, database, std::ref(progress)});
    KeyValues values;
    values.Add("records", static_cast<int64_t>(result.rows));
    values.Add("stored", static_cast<int64_t>(result.stored));
    values.Add("compared", kComparison);
    Print(values, format);
    return result.rows > 0 ? kExitFound : kExitNothing;
}

void AddClusterOption(Command command, Options &options) {
    command.AddText("--db", options.cluster, "PATH", "The description of the cluster");
    AddKeyValuesFormat(command, options.format);
}

} // namespace

void AddClusterTransfer(Program &program, Command cluster) {
    auto imported = std::make_shared<Options>();
    Command import = AddSubcommand(program, cluster, "import", "Move the logs of databases into the cluster",
                                   [imported] { return Interruptible([&] { return Import(*imported); }); });
    import.Footer(kImportFooter);
    import.AddTexts("DATABASE", imported->databases, "DATABASE", "Databases of SQLite: logs and archives")
        .AnyNumber()
        .Required();
    import.AddText("--node", imported->node, "N",
                   "A number from 0 to 255 that no log server and no other log has: it is a part of the ids");
    AddClusterOption(import, *imported);

    auto exported = std::make_shared<Options>();
    Command command = AddSubcommand(program, cluster, "export", "Move the logs of a cluster into a database",
                                    [exported] { return Interruptible([&] { return Export(*exported); }); });
    command.Footer(kExportFooter);
    exported->databases.resize(1);
    command
        .AddText("DATABASE", exported->databases.front(), "DATABASE",
                 "The database of SQLite, which is created when missing")
        .Required();
    AddClusterOption(command, *exported);
}

} // namespace kelo::tool
