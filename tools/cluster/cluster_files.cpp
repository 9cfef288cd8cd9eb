#include "cluster/cluster_files.h"

#include "cluster/cluster_tables.h"
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

std::string UserText(const ClusterLayout &layout, const std::string &name, const std::string &password) {
    std::string networks;
    for (const std::string &host : layout.Hosts()) {
        const bool isAddress = host.find_first_not_of("0123456789.") == std::string::npos;
        networks += Element(isAddress ? "ip" : "host", host);
    }
    for (const std::string &network : layout.networks)
        networks += Element("ip", network);
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
    "    <kelo_server><readonly>1</readonly></kelo_server>\n"
    "    <kelo_admin><skip_unavailable_shards>0</skip_unavailable_shards></kelo_admin>\n"
    "  </profiles>\n";

} // namespace

std::vector<ClusterFile> MakeClusterFiles(const ClusterLayout &layout) {
    const std::string reader = MakePassword(); // also of the user for partial answers
    const std::string administrator = MakePassword();
    const std::string server = MakePassword();
    std::vector<ClusterFile> files = {
        {"tables.sql", TablesText(layout)},
        {"cluster.conf", DescriptionText(layout, "kelo_reader", reader, "kelo_partial"), true},
        {"cluster-admin.conf", DescriptionText(layout, "kelo_admin", administrator, ""), true}};
    const std::string users =
        "<yandex>\n" + std::string(kProfiles) + "  <users>\n" + UserText(layout, "kelo_reader", reader) +
        UserText(layout, "kelo_partial", reader) + UserText(layout, "kelo_server", server) +
        UserText(layout, "kelo_admin", administrator) + "  </users>\n</yandex>\n";
    for (size_t shard = 0; shard < layout.shards.size(); ++shard) {
        for (const std::string &host : layout.shards[shard]) {
            const std::string macros =
                "  " +
                Element("macros", Element("shard", std::to_string(shard + 1)) + Element("replica", host)) +
                "\n";
            files.push_back(
                {host + "/config.d/kelosyslog.xml",
                 "<yandex>\n" + ServersText(layout, server) + KeepersText(layout) + macros + "</yandex>\n",
                 true});
            files.push_back({host + "/users.d/kelosyslog.xml", users});
        }
    }
    return files;
}

} // namespace kelo::tool
