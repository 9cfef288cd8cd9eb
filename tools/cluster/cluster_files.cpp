#include "cluster/cluster_files.h"

#include "cluster/cluster_tables.h"
#include "cluster/log_server_file.h"
#include "cluster/password.h"

namespace kelo::tool {
namespace {

constexpr char kName[] = "kelo"; // of the cluster in remote_servers

void ReplaceIn(std::string &text, const std::string &from, const std::string &to) {
    for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
        text.replace(at, from.size(), to);
}

std::string Element(const std::string &name, const std::string &content) {
    return "<" + name + ">" + content + "</" + name + ">";
}

// Without a keeper a server has the rows of its shard alone.
std::string TablesText(const ClusterLayout &layout) {
    std::string text = kClusterTables;
    ReplaceIn(text, "{cluster}", kName);
    if (layout.keepers.empty()) {
        ReplaceIn(text, "ReplicatedReplacingMergeTree('/kelo/{shard}/logs', '{replica}')",
                  "ReplacingMergeTree()");
        ReplaceIn(text, ", replicated_deduplication_window = 1000", "");
    }
    return text;
}

std::string DescriptionText(const ClusterLayout &layout, const std::string &user, const std::string &password,
                            const std::string &partialUser) {
    std::string text = "[cluster]\n";
    for (const std::string &host : layout.Hosts())
        text += "url=http://" + host + ":" + std::to_string(layout.httpPort) + "\n";
    text += "user=" + user + "\npassword=" + password + "\n";
    return partialUser.empty() ? text : text + "partial-user=" + partialUser + "\n";
}

std::string ServersText(const ClusterLayout &layout, const std::string &password) {
    std::string shards;
    for (const std::vector<std::string> &shard : layout.shards) {
        std::string replicas = "\n      " + Element("internal_replication", "true");
        for (const std::string &host : shard)
            replicas += "\n      " +
                        Element("replica",
                                Element("host", host) + Element("port", std::to_string(layout.nativePort)) +
                                    Element("user", "kelo_server") + Element("password", password));
        shards += "\n    " + Element("shard", replicas + "\n    ");
    }
    return "  " + Element("remote_servers", Element(kName, shards + "\n  ")) + "\n";
}

std::string KeepersText(const ClusterLayout &layout) {
    std::string nodes;
    for (const std::string &keeper : layout.keepers) {
        const size_t colon = keeper.find(':');
        nodes += "\n    <node>" + Element("host", keeper.substr(0, colon)) +
                 Element("port", keeper.substr(colon + 1)) + "</node>";
    }
    return nodes.empty() ? "" : "  " + Element("zookeeper", nodes + "\n  ") + "\n";
}

std::string HostsText(const std::vector<std::string> &hosts) {
    std::string text;
    for (const std::string &host : hosts) {
        const bool isAddress = host.find_first_not_of("0123456789.") == std::string::npos;
        text += Element(isAddress ? "ip" : "host", host);
    }
    return text;
}

// `networks`: the elements that say from where the user may connect.
std::string UserText(const std::string &networks, const std::string &name, const std::string &password) {
    return "    " +
           Element(name, "\n      " + Element("password_sha256_hex", Sha256Hex(password)) + "\n      " +
                             Element("networks", networks) + "\n      " + Element("profile", name) +
                             Element("quota", "default") + "\n      " +
                             Element("allow_databases", Element("database", "kelo")) + "\n    ") +
           "\n";
}

// A reader who may change settings (readonly 2) could read from other addresses.
constexpr char kProfiles[] =
    "  <profiles>\n"
    "    "
    "<kelo_reader><readonly>1</readonly><skip_unavailable_shards>0</skip_unavailable_shards></kelo_reader>\n"
    "    "
    "<kelo_partial><readonly>1</readonly><skip_unavailable_shards>1</skip_unavailable_shards></"
    "kelo_partial>\n"
    "    <kelo_writer><allow_ddl>0</allow_ddl></kelo_writer>\n"
    "    <kelo_server><readonly>1</readonly></kelo_server>\n"
    "    <kelo_admin><skip_unavailable_shards>0</skip_unavailable_shards></kelo_admin>\n"
    "  </profiles>\n";

struct ClusterPasswords {
    std::string reader = MakePassword(); // also of the user for partial answers
    std::string administrator = MakePassword();
    std::string server = MakePassword();
    std::string writer = MakePassword();
};

std::string UsersText(const ClusterLayout &layout, const ClusterPasswords &passwords) {
    std::string all = HostsText(layout.Hosts());
    for (const std::string &network : layout.networks)
        all += Element("ip", network);
    std::string users =
        UserText(all, "kelo_reader", passwords.reader) + UserText(all, "kelo_partial", passwords.reader) +
        UserText(all, "kelo_server", passwords.server) + UserText(all, "kelo_admin", passwords.administrator);
    std::vector<std::string> logServers;
    for (const LogServer &server : layout.logServers)
        logServers.push_back(server.host);
    if (!logServers.empty())
        users += UserText(HostsText(logServers), "kelo_writer", passwords.writer);
    return "<yandex>\n" + std::string(kProfiles) + "  <users>\n" + users + "  </users>\n</yandex>\n";
}

} // namespace

std::vector<ClusterFile> MakeClusterFiles(const ClusterLayout &layout) {
    const ClusterPasswords passwords;
    std::vector<ClusterFile> files = {
        {"tables.sql", TablesText(layout)},
        {"cluster.conf", DescriptionText(layout, "kelo_reader", passwords.reader, "kelo_partial"), true},
        {"cluster-admin.conf", DescriptionText(layout, "kelo_admin", passwords.administrator, ""), true}};
    const std::string users = UsersText(layout, passwords);
    for (size_t shard = 0; shard < layout.shards.size(); ++shard) {
        for (const std::string &host : layout.shards[shard]) {
            const std::string macros =
                "  " +
                Element("macros", Element("shard", std::to_string(shard + 1)) + Element("replica", host)) +
                "\n";
            files.push_back({host + "/config.d/kelosyslog.xml",
                             "<yandex>\n" + ServersText(layout, passwords.server) + KeepersText(layout) +
                                 macros + "</yandex>\n",
                             true});
            files.push_back({host + "/users.d/kelosyslog.xml", users});
        }
    }
    for (size_t i = 0; i < layout.logServers.size(); ++i)
        files.push_back({layout.logServers[i].host + "/syslog-ng/cluster.conf",
                         LogServerText(layout, i, passwords.writer), true});
    return files;
}

} // namespace kelo::tool
