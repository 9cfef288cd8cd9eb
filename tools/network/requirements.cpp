#include "network/requirements.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <net/if.h>
#include <netinet/in.h>

#include <cstring>
#include <ctime>
#include <fstream>
#include <map>
#include <memory>

#include "base/errors.h"
#include "network/certificates.h"
#include "network/inet_sockets.h"
#include "network/listeners.h"

namespace kelo::tool {
namespace {

bool HasIpv6() {
    return std::ifstream("/proc/net/if_inet6").peek() != std::ifstream::traits_type::eof();
}

bool IsOfThisMachine(int family, const void *address) {
    ifaddrs *raw = nullptr;
    if (getifaddrs(&raw) != 0)
        return true; // syslog-ng will find out
    const std::unique_ptr<ifaddrs, void (*)(ifaddrs *)> all(raw, freeifaddrs);
    for (const ifaddrs *item = all.get(); item != nullptr; item = item->ifa_next) {
        if (item->ifa_addr == nullptr || item->ifa_addr->sa_family != family)
            continue;
        const bool isSame =
            family == AF_INET
                ? std::memcmp(&reinterpret_cast<sockaddr_in *>(item->ifa_addr)->sin_addr, address, 4) == 0
                : std::memcmp(&reinterpret_cast<sockaddr_in6 *>(item->ifa_addr)->sin6_addr, address, 16) == 0;
        if (isSame)
            return true;
    }
    return false;
}

void RequireAddress(const std::string &address) {
    in6_addr binary{};
    const int family = IsIpv6(address) ? AF_INET6 : AF_INET;
    if (inet_pton(family, address.c_str(), &binary) != 1)
        throw UsageError("--address: '" + address +
                         "' is no numeric address; write for example any, 0.0.0.0, "
                         "192.0.2.1 or 2001:db8::1");
    if (family == AF_INET6 && !HasIpv6())
        throw UsageError("--address: '" + address + "': this machine has no IPv6");
    if (family == AF_INET6 && (IN6_IS_ADDR_LINKLOCAL(&binary) || IN6_IS_ADDR_V4MAPPED(&binary)))
        throw UsageError("--address: '" + address + "': syslog-ng cannot listen on an address of this kind");
    const bool isAny = address == "0.0.0.0" || IN6_IS_ADDR_UNSPECIFIED(&binary);
    const bool isLoopback = family == AF_INET && address.starts_with("127.");
    if (!isAny && !isLoopback && !IsOfThisMachine(family, &binary))
        throw UsageError("--address: " + address + " is no address of this machine (ip address)");
}

void RequireOneUseEach(const NetworkSettings &settings) {
    std::map<uint16_t, const char *> uses;
    const auto use = [&](uint16_t port, const char *option) {
        const auto [other, isFree] = uses.emplace(port, option);
        if (!isFree)
            throw UsageError(std::string(option) + ": " + std::to_string(port) + " is the port of " +
                             other->second + " too");
    };
    if (settings.isPlain) {
        use(settings.port, "--port");
        use(settings.framePort, "--frame-port");
    }
    if (settings.isTls)
        use(settings.tlsPort, "--tls-port");
}

void RequireFreePorts(const NetworkSettings &settings, pid_t syslogNg) {
    const auto own = SocketsOf(syslogNg);
    if (!own && syslogNg != 0)
        return; // its own sockets cannot be told from others'
    const std::vector<InetSocket> sockets = ReadInetSockets(syslogNg);
    for (const Listener &listener : ConfiguredListeners(settings)) {
        for (const InetSocket &socket : sockets) {
            if (!socket.isListening || socket.isTcp != listener.isTcp || socket.port != listener.port ||
                !DoOverlap(socket.address, listener.address) || (own && own->contains(socket.inode)))
                continue;
            const std::string owner = OwnerOfSocket(socket.inode);
            throw UsageError(listener.Name() + " is in use by " +
                             (owner.empty() ? "a process that cannot be seen" : owner));
        }
    }
}

} // namespace

std::string ResolveListenAddress(const std::string &text) {
    std::string address = text;
    if (text == "any")
        address = HasIpv6() ? "::" : "0.0.0.0";
    RequireAddress(address);
    char normal[INET6_ADDRSTRLEN];
    in6_addr binary{};
    const int family = IsIpv6(address) ? AF_INET6 : AF_INET;
    inet_pton(family, address.c_str(), &binary);
    return inet_ntop(family, &binary, normal, sizeof normal);
}

void RequirePossible(const NetworkSettings &settings, const std::string &root, pid_t syslogNg) {
    RequireAddress(settings.address);
    if (!settings.isPlain && !settings.isTls)
        throw UsageError("--plain off: without --tls on nothing would be received");
    RequireOneUseEach(settings);
    RequireFreePorts(settings, syslogNg);
    if (!settings.isTls)
        return;
    const TlsFiles files = InspectTlsFiles(root + settings.tlsFolder, std::time(nullptr));
    if (!files.faults.empty())
        throw UsageError("--tls: " + files.faults.front());
}

} // namespace kelo::tool
