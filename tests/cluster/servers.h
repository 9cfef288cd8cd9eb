#pragma once

#include <memory>
#include <string>
#include <vector>

#include "support/child_program.h"

namespace kelo::test {

// Two servers of a cluster on loopback, one shard each, with folders and ports of their own; set up by the
// files of "kelosyslog cluster init".
class Servers {
public:
    // Whether the server is installed.
    static bool AreInstalled();

    // Starts both and creates the tables. Throws std::runtime_error.
    Servers();

    // Runs a statement on a server as its administrator; the answer. Throws std::runtime_error.
    std::string Run(size_t server, const std::string &sql) const;

    // Ends a server; starts it again and waits until it answers.
    void Kill(size_t server) { programs_[server].reset(); }
    void Start(size_t server);

    // A file that "kelosyslog cluster init" made.
    std::string Made(const std::string &name) const { return root_.File("new/" + name); }
    int HttpPort() const { return ports_[0]; }
    std::string Url(size_t server) const;
    std::string NativeAddress(size_t server) const;

private:
    static constexpr size_t kServers = 2;
    void WriteConfiguration(size_t server) const;

    TempRoot root_;
    std::vector<int> ports_; // HTTP, native and between servers
    std::unique_ptr<ChildProgram> programs_[kServers];
};

// The servers that all tests of the program share.
extern Servers *sharedServers;

} // namespace kelo::test
