#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace kelo::platform {

// The first line of a file that describes a cluster.
inline constexpr std::string_view kClusterHeading = "[cluster]";

// How to reach a cluster (docs/cluster.md has the format of the file).
struct ClusterConfiguration {
    std::string path;
    std::vector<std::string> urls; // of the servers; without a slash at the end
    std::string user;
    std::string password;
    std::string partialUser; // whose answers may lack servers that are away; "" for none
    std::string database = "kelo";
    std::string caFile; // "" for the system's
    long timeoutSec = 300;
};

// Reads the file. Throws ClusterError, with the number of the line where one is wrong.
ClusterConfiguration ReadClusterConfiguration(const std::string &path);

} // namespace kelo::platform
