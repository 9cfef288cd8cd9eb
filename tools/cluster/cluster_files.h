#pragma once

#include <string>
#include <vector>

#include "cluster/cluster_layout.h"

namespace kelo::tool {

// A file that a cluster needs, by its path below a folder.
struct ClusterFile {
    std::string path;
    std::string text;
    bool isSecret = false; // it holds a password
};

// All files of a new cluster, with new passwords:
//
//     tables.sql                        the tables, for each server
//     cluster.conf                      describes the cluster for readers
//     cluster-admin.conf                the same for those who may delete
//     HOST/config.d/kelosyslog.xml      the servers, and what this one is
//     HOST/users.d/kelosyslog.xml       the users and their rights
//     HOST/syslog-ng/cluster.conf       where a log server stores
std::vector<ClusterFile> MakeClusterFiles(const ClusterLayout &layout);

} // namespace kelo::tool
