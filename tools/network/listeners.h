#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>
#include <vector>

#include "network/inet_sockets.h"
#include "network/settings.h"

namespace kelo::tool {

// A socket at which syslog-ng receives, or should.
struct Listener {
    bool isTcp = false;
    std::string address;
    uint16_t port = 0;
    const char *form = "";     // "datagrams", "lines", "frames"; "" for a socket that is not of our settings
    bool isTls = false;        // of our settings
    bool isConfigured = false; // by our settings
    bool isKnown = false;      // the sockets of syslog-ng could be read
    bool isOpen = false;
    uint64_t connections = 0;
    uint64_t mostConnections = 0; // 0 for a socket that is not of our settings
    uint64_t drops = 0;           // datagrams that the kernel discarded

    // "TCP 192.0.2.1 port 514"
    std::string Name() const;
    // "IPv4", "IPv6" or "IPv4, IPv6"
    std::string Families() const;
};

// What the settings ask for.
std::vector<Listener> ConfiguredListeners(const NetworkSettings &settings);

// The same with the state of the sockets of this syslog-ng, followed by its other sockets. Without permission
// to look at its descriptors, its sockets are those of its user at the ports of the settings.
std::vector<Listener> FindListeners(const NetworkSettings &settings, pid_t syslogNg);

// Whether two sockets of one port and protocol exclude each other.
bool DoOverlap(const std::string &address, const std::string &other);

} // namespace kelo::tool
