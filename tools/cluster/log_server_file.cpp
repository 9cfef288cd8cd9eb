#include "cluster/log_server_file.h"

#include <algorithm>

namespace kelo::tool {
namespace {

// format-json writes JSON for every message: bytes that are not UTF-8 become the text \xff, others are
// escaped. So there is no row that the engine refuses, and every answer but success can be taken for a fault
// that passes.
constexpr char kText[] =
    R"conf(# Stores the messages of this log server in a cluster; written by "kelosyslog cluster init" and read by kelosyslog.conf with
# kelo_cluster "yes". Put it into /etc/kelosyslog/syslog-ng, owned by root with mode 0600: it has a password.
# It needs the package syslog-ng-mod-http.

@define kelo_cluster_node    "{node}"     # the number of this log server, 1 to 255: no other has it, and it never changes
@define kelo_cluster_workers "{workers}"     # each has a buffer of kelo_buffer_bytes; lower it only while all are empty
@define kelo_cluster_batch   "10000" # messages sent at once

destination d_kelo_servers {
  http(
    # The servers of its shard, always the same.
    url({urls})
    method("POST") user("kelo_writer") password("{password}") headers("Content-Type: text/plain")
    body-prefix("INSERT INTO kelo.logs_shard (host, ip, fac, prio, llevel, tag, utcsec, tzoffset, ldate, ltime, prog, msg, node, rcptid) FORMAT JSONEachRow\n")
    # The values of the destination d_kelo_database. RCPTID is the same when a message is sent again.
    body("$(format-json host=${HOST} ip=${.kelo.ip} fac=${FACILITY} prio=${LEVEL} llevel=${LEVEL} tag=${TAG} utcsec=int64(${R_UNIXTIME}) tzoffset=${R_TZOFFSET} ldate='${R_YEAR}/${R_MONTH}/${R_DAY}' ltime='${R_HOUR}:${R_MIN}:${R_SEC}' prog=${PROGRAM} msg=${MESSAGE} node=int(`kelo_cluster_node`) rcptid=int64(${RCPTID}))")
    delimiter("\n")
    workers(`kelo_cluster_workers`) batch-lines(`kelo_cluster_batch`) batch-bytes(33554432) batch-timeout(1000)
    timeout(60) time-reopen(1) retries(1000000)
    # A message is never dropped: a wrong password, a missing table and a full disk pass once they are mended.
    response-action({actions})
    disk-buffer(reliable(yes) disk-buf-size(`kelo_buffer_bytes`) mem-buf-size(`kelo_buffer_window`)
      truncate-size-ratio(1) dir("`kelo_buffer_dir`"))
    persist-name("kelo_servers")
  );
};
)conf";

constexpr int kErrors[] = {400, 401, 403, 404, 405, 408, 411, 413, 414, 429, 500, 501, 502, 503, 504};

void Replace(std::string &text, const std::string &from, const std::string &to) {
    text.replace(text.find(from), from.size(), to);
}

} // namespace

std::string LogServerText(const ClusterLayout &layout, size_t index, const std::string &password) {
    const std::vector<std::string> &hosts = layout.shards[layout.logServers[index].shard];
    std::string urls;
    for (const std::string &host : hosts)
        urls += (urls.empty() ? "\"http://" : " \"http://") + host + ":" + std::to_string(layout.httpPort) +
                "/\"";
    std::string actions;
    for (const int status : kErrors)
        actions += (actions.empty() ? "" : " ") + std::to_string(status) + " => disconnect";
    std::string text = kText;
    Replace(text, "{node}", std::to_string(index + 1));
    Replace(text, "{workers}",
            std::to_string(std::max<size_t>(2, hosts.size()))); // fewer would leave servers out
    Replace(text, "{urls}", urls);
    Replace(text, "{password}", password);
    Replace(text, "{actions}", actions);
    return text;
}

} // namespace kelo::tool
