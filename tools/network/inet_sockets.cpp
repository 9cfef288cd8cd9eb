#include "network/inet_sockets.h"

#include <arpa/inet.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

enum State : unsigned { kEstablished = 1, kUnconnected = 7, kListening = 10 }; // of the kernel

// "0100007F:0202", the address in words of the machine's byte order.
bool ReadAddress(const std::string &text, InetSocket &socket) {
    const size_t colon = text.find(':');
    if (colon != 8 && colon != 32)
        return false;
    uint32_t words[4] = {};
    for (size_t i = 0; i < colon / 8; ++i)
        words[i] = static_cast<uint32_t>(std::strtoul(text.substr(8 * i, 8).c_str(), nullptr, 16));
    char name[INET6_ADDRSTRLEN];
    inet_ntop(colon == 8 ? AF_INET : AF_INET6, words, name, sizeof name);
    socket.address = name;
    socket.port = static_cast<uint16_t>(std::strtoul(text.c_str() + colon + 1, nullptr, 16));
    return true;
}

// The kernel hands out a table page by page and finds its place again by counting, so a socket may come twice
// when others are opened meanwhile.
void ReadTable(const std::string &path, bool isTcp, std::vector<InetSocket> &sockets) {
    std::set<uint64_t> known;
    std::ifstream file(path);
    std::string line;
    std::getline(file, line); // names of the columns
    while (std::getline(file, line)) {
        std::istringstream fields(line);
        std::string skipped;
        std::string own;
        unsigned state = 0;
        InetSocket socket;
        socket.isTcp = isTcp;
        fields >> skipped >> own >> skipped >> std::hex >> state >> std::dec >> skipped >> skipped >>
            skipped >> socket.user >> skipped >> socket.inode;
        if (!fields || !ReadAddress(own, socket) || (socket.inode != 0 && !known.insert(socket.inode).second))
            continue;
        socket.isListening = state == (isTcp ? kListening : kUnconnected);
        socket.isEstablished = isTcp && state == kEstablished;
        if (!isTcp) // the last column
            fields >> skipped >> skipped >> socket.drops;
        sockets.push_back(std::move(socket));
    }
}

std::string NetworkFolder(pid_t pid) {
    return "/proc/" + (pid > 0 ? std::to_string(pid) : std::string("self")) + "/net/";
}

// The inode of a link "socket:[123]"; 0 for other links.
uint64_t InodeOf(const fs::path &link, std::error_code &error) {
    const std::string target = fs::read_symlink(link, error).string();
    constexpr std::string_view kStart = "socket:[";
    return target.starts_with(kStart) ? std::strtoull(target.c_str() + kStart.size(), nullptr, 10) : 0;
}

} // namespace

bool AreSocketsReadable(pid_t pid) {
    return access((NetworkFolder(pid) + "tcp").c_str(), R_OK) == 0;
}

std::vector<InetSocket> ReadInetSockets(pid_t pid) {
    const std::string folder = NetworkFolder(pid);
    std::vector<InetSocket> sockets;
    for (const char *name : {"udp", "udp6", "tcp", "tcp6"})
        ReadTable(folder + name, name[0] == 't', sockets);
    return sockets;
}

std::optional<std::set<uint64_t>> SocketsOf(pid_t pid) {
    std::error_code error;
    std::set<uint64_t> inodes;
    fs::directory_iterator files("/proc/" + std::to_string(pid) + "/fd", error);
    if (error)
        return std::nullopt;
    for (; !error && files != fs::directory_iterator(); files.increment(error)) {
        std::error_code unread;
        inodes.insert(InodeOf(files->path(), unread));
        if (unread == std::errc::permission_denied) // root without privileges may list them alone
            return std::nullopt;
    }
    inodes.erase(0);
    return inodes;
}

std::string OwnerOfSocket(uint64_t inode) {
    std::error_code error;
    for (fs::directory_iterator folders("/proc", error); !error && folders != fs::directory_iterator();
         folders.increment(error)) {
        const std::string name = folders->path().filename().string();
        const auto pid = static_cast<pid_t>(std::strtol(name.c_str(), nullptr, 10));
        const auto inodes = pid > 0 ? SocketsOf(pid) : std::nullopt;
        if (!inodes || !inodes->contains(inode))
            continue;
        std::string program;
        std::getline(std::ifstream(folders->path() / "comm"), program);
        return "process " + name + " (" + program + ")";
    }
    return "";
}

} // namespace kelo::tool
