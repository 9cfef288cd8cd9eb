#pragma once

#include <sys/types.h>

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace kelo::tool {

// A TCP or UDP socket, as /proc shows it (proc(5)).
struct InetSocket {
    bool isTcp = false;
    bool isListening = false;   // it waits for connections, or for datagrams of everybody
    bool isEstablished = false; // a connection of TCP
    std::string address;        // its own; an IPv4 address of a socket of IPv6 as "::ffff:192.0.2.1"
    uint16_t port = 0;          // its own
    uid_t user = 0;
    uint64_t inode = 0; // 0 for a connection that no process has open
    uint64_t drops = 0; // datagrams that the kernel discarded for lack of room
};

// The sockets in the network of a process, or of the caller's for 0. One may be missing when others are
// closed meanwhile.
std::vector<InetSocket> ReadInetSockets(pid_t pid);

// Whether they can be read: a sandbox may hide the process.
bool AreSocketsReadable(pid_t pid);

// The inodes of the sockets that the process has open; nothing without permission to look.
std::optional<std::set<uint64_t>> SocketsOf(pid_t pid);

// "process 123 (name)" for a process that has the socket open; "" if none can be seen.
std::string OwnerOfSocket(uint64_t inode);

} // namespace kelo::tool
