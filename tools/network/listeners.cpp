#include "network/listeners.h"

#include <sys/stat.h>

#include <algorithm>
#include <fstream>

namespace kelo::tool {
namespace {

constexpr const char *kAnyIpv4 = "0.0.0.0";
constexpr const char *kAny = "::";

// Whether a socket at "::" receives from IPv6 alone (sysctl net.ipv6.bindv6only); syslog-ng leaves the
// default.
bool IsIpv6Separate() {
    int isSeparate = 0;
    std::ifstream("/proc/sys/net/ipv6/bindv6only") >> isSeparate;
    return isSeparate != 0;
}

// Which sockets are those of syslog-ng.
class Ownership {
public:
    Ownership(const NetworkSettings &settings, pid_t syslogNg) : inodes_(SocketsOf(syslogNg)) {
        struct stat status {};
        if (stat(("/proc/" + std::to_string(syslogNg)).c_str(), &status) == 0)
            user_ = status.st_uid;
        for (const Listener &listener : ConfiguredListeners(settings))
            ports_.insert(listener.port);
    }
    bool Has(const InetSocket &socket) const {
        return inodes_ ? inodes_->contains(socket.inode)
                       : socket.user == user_ && ports_.contains(socket.port);
    }

private:
    std::optional<std::set<uint64_t>> inodes_;
    uid_t user_ = 0;
    std::set<uint16_t> ports_;
};

// The addresses of one port that belong to connections of a listener.
bool IsAt(const InetSocket &connection, const Listener &listener) {
    constexpr const char *kMapped = "::ffff:";
    return connection.isTcp == listener.isTcp && connection.port == listener.port &&
           (listener.address == kAny || listener.address == connection.address ||
            (listener.address == kAnyIpv4 && !IsIpv6(connection.address)) ||
            kMapped + listener.address == connection.address);
}

std::vector<Listener> ReadListeners(const NetworkSettings &settings, const Ownership &ownership,
                                    pid_t syslogNg) {
    std::vector<Listener> listeners = ConfiguredListeners(settings);
    const std::vector<InetSocket> sockets = ReadInetSockets(syslogNg);
    for (Listener &listener : listeners)
        listener.isKnown = AreSocketsReadable(syslogNg);
    for (const InetSocket &socket : sockets) {
        if (!socket.isListening || !ownership.Has(socket))
            continue;
        auto listener = std::find_if(listeners.begin(), listeners.end(), [&](const Listener &known) {
            return known.isTcp == socket.isTcp && known.address == socket.address &&
                   known.port == socket.port;
        });
        if (listener == listeners.end()) {
            listener = listeners.emplace(listeners.end());
            listener->isTcp = socket.isTcp;
            listener->isKnown = true;
            listener->address = socket.address;
            listener->port = socket.port;
        }
        listener->isOpen = true;
        listener->drops += socket.drops;
    }
    for (const InetSocket &socket : sockets) {
        if (!socket.isEstablished || !ownership.Has(socket))
            continue;
        const auto listener = std::find_if(listeners.begin(), listeners.end(), [&](const Listener &known) {
            return known.isOpen && IsAt(socket, known);
        });
        if (listener != listeners.end())
            ++listener->connections;
    }
    return listeners;
}

} // namespace

std::string Listener::Name() const {
    return std::string(isTcp ? "TCP " : "UDP ") + address + " port " + std::to_string(port);
}

std::string Listener::Families() const {
    if (!IsIpv6(address))
        return "IPv4";
    return address == kAny && !IsIpv6Separate() ? "IPv4, IPv6" : "IPv6";
}

std::vector<Listener> ConfiguredListeners(const NetworkSettings &settings) {
    std::vector<Listener> listeners;
    const auto add = [&](bool isTcp, uint16_t port, const char *form, bool isTls) {
        Listener listener;
        listener.isTcp = isTcp;
        listener.address = settings.address;
        listener.port = port;
        listener.form = form;
        listener.isTls = isTls;
        listener.isConfigured = true;
        listener.mostConnections = isTcp ? settings.connections : 0;
        listeners.push_back(std::move(listener));
    };
    if (settings.isPlain) {
        add(false, settings.port, "datagrams", false);
        add(true, settings.port, "lines", false);
        add(true, settings.framePort, "frames", false);
    }
    if (settings.isTls)
        add(true, settings.tlsPort, "frames", true);
    return listeners;
}

std::vector<Listener> FindListeners(const NetworkSettings &settings, pid_t syslogNg) {
    constexpr int kReadings = 3; // as one may miss a socket
    const Ownership ownership(settings, syslogNg);
    for (int reading = 1;; ++reading) {
        std::vector<Listener> listeners = ReadListeners(settings, ownership, syslogNg);
        const bool areAllOpen = std::all_of(listeners.begin(), listeners.end(),
                                            [](const Listener &listener) { return listener.isOpen; });
        if (areAllOpen || reading == kReadings)
            return listeners;
    }
}

bool DoOverlap(const std::string &address, const std::string &other) {
    const auto covers = [](const std::string &wide, const std::string &narrow) {
        return wide == narrow || (wide == kAny && (IsIpv6(narrow) || !IsIpv6Separate())) ||
               (wide == kAnyIpv4 && !IsIpv6(narrow)) || wide == "::ffff:" + narrow;
    };
    return covers(address, other) || covers(other, address);
}

} // namespace kelo::tool
