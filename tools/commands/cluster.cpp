// kelosyslog cluster: sets up a cluster.

#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "base/atomic_file.h"
#include "base/errors.h"
#include "cli/exit_status.h"
#include "cluster/cluster_files.h"
#include "commands/cluster_commands.h"
#include "commands/cluster_transfer.h"
#include "commands/commands.h"
#include "commands/common_options.h"
#include "print/action_lines.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

constexpr const char *kFooter =
    "Writes the files of a new cluster of ClickHouse servers, with new passwords, and changes nothing else:\n"
    "tables.sql; cluster.conf and cluster-admin.conf, which describe the cluster for those who read and for\n"
    "those who delete; for each server HOST/config.d/kelosyslog.xml and HOST/users.d/kelosyslog.xml, which "
    "go\n"
    "into its folder /etc/clickhouse-server; and for each log server HOST/syslog-ng/cluster.conf, which goes "
    "into\n"
    "its folder /etc/kelosyslog. docs/cluster.md has the steps.\n\n"
    "Examples:\n"
    "  kelosyslog cluster init new --shard 10.0.0.1 --shard 10.0.0.2 --log-server 10.0.0.9\n"
    "  kelosyslog cluster init new --shard db1,db2 --shard db3,db4 --keeper db1 --keeper db2 --keeper db3\n\n"
    "Exit status: 0 written, 2 usage, 4 the folder is there already or cannot be written.";

struct Options {
    std::string folder;
    std::string format = "text";
    ClusterLayoutOptions layout;
};

// Nobody else may look into the folder, and so nobody sees a password.
void MakeFolder(const std::string &path) {
    if (mkdir(path.c_str(), 0700) != 0)
        throw OutputError(path + ": " + std::strerror(errno));
}

int Init(const Options &options) {
    if (options.layout.shards.empty())
        throw UsageError("cluster init: no --shard");
    ActionLines lines(ParseKeyValuesFormat(options.format));
    const ClusterLayout layout = ReadClusterLayout(options.layout);
    MakeFolder(options.folder);
    for (const ClusterFile &made : MakeClusterFiles(layout)) {
        const std::string path = options.folder + "/" + made.path;
        std::error_code error;
        fs::create_directories(fs::path(path).parent_path(), error);
        if (error)
            throw OutputError(path + ": " + error.message());
        AtomicFile file(path);
        file.Write(made.text);
        file.Commit();
        if (chmod(path.c_str(), made.isSecret ? 0640 : 0644) != 0)
            file.Fail(std::strerror(errno));
        lines.Add(path);
    }
    lines.End();
    return kExitFound;
}

} // namespace

void AddCluster(Program &program) {
    Command cluster = program.Top().AddBelow(
        "cluster", "Set up and look after a cluster of servers instead of one database, and move records");
    cluster.NeedBelow(1, 1);
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, cluster, "init", "Write the files of a new cluster",
                                    [options] { return Init(*options); });
    command.Footer(kFooter);
    command.AddText("folder", options->folder, "FOLDER", "The new folder for the files").Required();
    command.AddTexts("--shard", options->layout.shards, "HOST[,HOST]",
                     "The server of a shard, or the servers that all have its records; once for each shard");
    command.AddTexts("--keeper", options->layout.keepers, "HOST[:PORT]",
                     "A server of ZooKeeper (port 2181), which shards of several servers need");
    command.AddTexts("--log-server", options->layout.logServers, "HOST[:SHARD]",
                     "A log server, and the number of the shard that gets its messages (default: the shards "
                     "in turn)");
    command.AddTexts("--network", options->layout.networks, "ADDRESS",
                     "From here users may connect, like 192.0.2.0/24; the servers always may");
    command.AddText("--http-port", options->layout.httpPort, "PORT", "Where readers connect (default: 8123)");
    command.AddText("--native-port", options->layout.nativePort, "PORT",
                    "Where the servers connect to each other (default: 9000)");
    AddKeyValuesFormat(command, options->format);
    AddClusterTransfer(program, cluster);
    AddClusterState(program, cluster);
    AddClusterRetention(program, cluster);
}

} // namespace kelo::tool
