#pragma once

#include <string>

#include "cluster/cluster_layout.h"

namespace kelo::tool {

// What syslog-ng of a log server of the layout reads in order to store into its shard: the destination
// d_kelo_servers of kelosyslog.conf. `index` is of the log server; its number in the cluster is one more.
std::string LogServerText(const ClusterLayout &layout, size_t index, const std::string &password);

} // namespace kelo::tool
