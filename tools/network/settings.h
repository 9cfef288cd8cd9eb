#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>

namespace kelo::tool {

// The settings cannot be read, or syslog-ng does not take them from there. The text names the file.
struct SettingsError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

// Where and how the shipped configuration of syslog-ng receives: its definitions kelo_address and so on.
struct NetworkSettings {
    std::string address = "127.0.0.1"; // numeric; "0.0.0.0" for all of IPv4, "::" for all
    bool isPlain = true;               // without encryption
    uint16_t port = 514;               // UDP and TCP, lines
    uint16_t framePort = 601;          // TCP, messages with their lengths
    bool isTls = false;
    uint16_t tlsPort = 6514;
    std::string internalSource; // counts who is refused over TLS; "": nothing does
    bool isRateLimited = false;
    uint64_t rate = 1000;       // messages a second of one address
    uint64_t connections = 256; // most of each TCP port
    std::string tlsFolder = "/etc/kelosyslog/tls";
    std::string spool; // the folder of the message spool; "" when messages are stored in another way

    bool operator==(const NetworkSettings &) const = default;
};

// The files below a root. syslog-ng begins with the first, reads the second through the link, and the second
// includes the last.
std::string MainConfigurationPath(const std::string &root);
std::string ConfigurationPath(const std::string &root);
std::string ConfigurationLink(const std::string &root);
std::string ListenPath(const std::string &root);

// Whether syslog-ng reads the configuration: whether the link is there.
bool IsConfigurationUsed(const std::string &root);

// Throws SettingsError if ours does not include the last, as in earlier versions.
void RequireInclude(const std::string &root);

// The settings of both files; what neither sets has its default. Throws SettingsError for a configuration
// that is missing and for a value that makes no sense.
NetworkSettings ReadNetworkSettings(const std::string &root);

// The source of syslog-ng.conf with internal(); "" when that file has none.
std::string FindInternalSource(const std::string &root);

// The content of the last file.
std::string WriteNetworkSettings(const NetworkSettings &settings);

// Whether the address is one of IPv6.
bool IsIpv6(const std::string &address);

} // namespace kelo::tool
