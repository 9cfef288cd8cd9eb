#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "network/listeners.h"
#include "status/syslog_ng.h"

namespace kelo::tool {

// Where syslog-ng receives.
struct NetworkStatus {
    bool isUsed = false; // syslog-ng reads our configuration
    std::string problem; // why its settings cannot be read
    NetworkSettings settings;
    std::vector<Listener> listeners;
    std::vector<std::string> tlsProblems; // of the certificates, while TLS is on
};

// Reads the settings below `root` and the sockets of this syslog-ng. One with another control socket has none
// of these settings.
NetworkStatus GatherNetwork(const std::string &root, bool isOther, const SyslogNgStatus &syslogNg);

// What needs attention in it, one line each.
std::vector<std::string> FindNetworkProblems(const NetworkStatus &status, const SyslogNgStatus &syslogNg);

} // namespace kelo::tool
