// kelosyslog listen: what it refuses before anything changes, what it writes, and what it finds.

#include <fcntl.h>
#include <netinet/in.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <thread>

#include "base/files.h"
#include "network/certificates.h"
#include "network/listeners.h"
#include "network/take_over.h"
#include "support/program_test.h"

namespace kelo::test {
namespace {

using namespace kelo::tool;

class Listen : public ProgramTest {
protected:
    Listen() {
        const std::string shipped = ReadFile(SourcePath("package/syslog-ng/kelosyslog.conf"));
        const std::string line = "@define kelo_listen     \"";
        const size_t at = shipped.find(line) + line.size();
        WriteFile(configuration_, shipped.substr(0, at) + root_.Path() + shipped.substr(at));
        fs::create_directories(root_.File("etc/syslog-ng/conf.d"));
        fs::create_symlink(configuration_, root_.File("etc/syslog-ng/conf.d/kelosyslog.conf"));
        WriteFile(root_.File("etc/syslog-ng/syslog-ng.conf"),
                  "@version: 3.38\n@include \"" + configuration_ + "\"\n");
    }
    void Shell(const std::string &script) const {
        const ProgramResult result = RunIn(root_.Path(), "set -e; " + script);
        ASSERT_EQ(result.status, 0) << script << "\n" << result.err;
    }

    const std::string configuration_ = root_.File("etc/kelosyslog/syslog-ng/kelosyslog.conf");
    const std::string listen_ = root_.File("etc/kelosyslog/syslog-ng/listen.conf");
    const std::string tls_ = root_.File("etc/kelosyslog/tls");
};

// A socket of this process at a free port.
struct BoundSocket {
    BoundSocket(int family, int type) : file(socket(family, type, 0)) {
        sockaddr_in6 address{};
        address.sin6_family = static_cast<sa_family_t>(family); // the rest is zero: any address, any port
        const socklen_t size = family == AF_INET6 ? sizeof address : sizeof(sockaddr_in);
        socklen_t length = sizeof address;
        if (bind(file.Get(), reinterpret_cast<sockaddr *>(&address), size) != 0 ||
            (type == SOCK_STREAM && listen(file.Get(), 1) != 0) ||
            getsockname(file.Get(), reinterpret_cast<sockaddr *>(&address), &length) != 0)
            throw std::runtime_error("no socket");
        port = ntohs(address.sin6_port);
    }
    FileHandle file;
    uint16_t port;
};

TEST_F(Listen, RefusesWhatCannotBeAndChangesNothing) {
    const BoundSocket taken(AF_INET, SOCK_STREAM);
    const std::string port = std::to_string(taken.port);
    const std::tuple<std::string, std::string> refused[] = {
        {"--address 192.0.2.77", "192.0.2.77 is no address of this machine"},
        {"--address localhost", "'localhost' is no numeric address"},
        {"--address fe80::1", "of this kind"},
        {"--port 0", "--port: '0'"},
        {"--port 601", "--frame-port: 601 is the port of --port too"},
        {"--port " + port,
         "TCP 127.0.0.1 port " + port + " is in use by process " + std::to_string(getpid())},
        {"--frame-port " + port + " --address any", "is in use by"},
        {"--plain off", "nothing would be received"},
        {"--tls maybe", "'maybe' is neither on nor off"},
        {"--tls on", "server.pem cannot be read: No such file"},
        {"--rate-limit 0", "--rate-limit: '0'"},
        {"--dry-run", "goes with a change only"},
    };
    for (const auto &[words, named] : refused) {
        const ProgramResult result = Run("listen " + words);
        EXPECT_EQ(result.status, 2) << words;
        EXPECT_THAT(result.err, HasSubstr(named)) << words;
        EXPECT_FALSE(fs::exists(listen_)) << words;
    }
    {
        const FileHandle lock(
            open(root_.File("etc/kelosyslog/syslog-ng/.listen.conf.lock").c_str(), O_RDWR | O_CREAT, 0600));
        ASSERT_EQ(flock(lock.Get(), LOCK_EX), 0);
        EXPECT_THAT(Run("listen --address any").err, HasSubstr("another kelosyslog listen"));
    }
    Expect("listen --address 127.0.0.2 --dry-run", 0);
    EXPECT_FALSE(fs::exists(listen_));
    WriteFile(root_.File("etc/syslog-ng/syslog-ng.conf"), "@version: 3.38\nnonsense\n");
    EXPECT_THAT(Run("listen --address any").err, HasSubstr("refuses its configuration as it is"));
    fs::remove(root_.File("etc/syslog-ng/conf.d/kelosyslog.conf"));
    EXPECT_THAT(Run("listen --address any").err, HasSubstr("conf.d/kelosyslog.conf is missing"));
    WriteFile(configuration_, "@define kelo_address \"127.0.0.1\"\n");
    EXPECT_THAT(Run("listen --address any").err, HasSubstr("it is of an earlier version"));
    EXPECT_FALSE(fs::exists(listen_));
}

TEST_F(Listen, KeepsWhatItWrote) {
    Expect("listen --address 127.0.0.2 --port 5141 --rate-limit 7", 0);
    Expect("listen --frame-port 5142", 0);
    const NetworkSettings settings = ReadNetworkSettings(root_.Path());
    NetworkSettings wanted;
    wanted.address = "127.0.0.2", wanted.port = 5141, wanted.framePort = 5142;
    wanted.isRateLimited = true, wanted.rate = 7;
    wanted.spool = "/var/spool/kelosyslog"; // as shipped
    EXPECT_EQ(settings, wanted);
    Expect("listen --port 5141", 1, "nothing to change\n");
    WriteFile(listen_, "@define kelo_port \"70000\"\n");
    EXPECT_THAT(Run("listen").err, HasSubstr("listen.conf: kelo_port is \"70000\""));
}

TEST_F(Listen, FindsTheSourceOfSyslogNgsMessages) {
    const std::pair<const char *, const char *> configurations[] = {
        {"source s_src {\n  system();\n  internal();\n};", "s_src"},
        {"source a { system(); }; source my-own { internal ( ); };", "my-own"},
        {"# source s_src { internal(); };\nsource a { system(); # internal();\n };", ""},
        {"", ""},
    };
    for (const auto &[text, source] : configurations) {
        WriteFile(root_.File("etc/syslog-ng/syslog-ng.conf"), text);
        EXPECT_EQ(FindInternalSource(root_.Path()), source) << text;
    }
}

TEST_F(Listen, FindsTheSocketsOfAProcess) {
    const BoundSocket lines(AF_INET, SOCK_STREAM);
    const BoundSocket other(AF_INET6, SOCK_DGRAM);
    NetworkSettings settings;
    settings.address = "0.0.0.0";
    settings.port = lines.port;
    settings.framePort = 1;
    const FileHandle client(socket(AF_INET, SOCK_STREAM, 0));
    sockaddr_in address{AF_INET, htons(lines.port), {htonl(INADDR_LOOPBACK)}, {}};
    ASSERT_EQ(connect(client.Get(), reinterpret_cast<sockaddr *>(&address), sizeof address), 0);
    const FileHandle accepted(accept(lines.file.Get(), nullptr, nullptr));
    std::vector<std::string> found;
    for (const Listener &listener : FindListeners(settings, getpid()))
        found.push_back(listener.Name() + " " + listener.Families() +
                        (listener.isOpen ? " open " : " closed ") + std::to_string(listener.connections));
    const std::string port = std::to_string(lines.port);
    EXPECT_THAT(found,
                ElementsAre("UDP 0.0.0.0 port " + port + " IPv4 closed 0",
                            "TCP 0.0.0.0 port " + port + " IPv4 open 1", "TCP 0.0.0.0 port 1 IPv4 closed 0",
                            "UDP :: port " + std::to_string(other.port) + " IPv4, IPv6 open 0"));
    // What does not listen as it should is restarted; a new port alone needs a reload.
    EXPECT_EQ(NeededStep(settings, settings, getpid()), Step::kRestart);
}

TEST_F(Listen, ShowsASocketOnceWhileOthersComeAndGo) {
    std::vector<BoundSocket> kept; // more than a page of the kernel's table
    for (int i = 0; i < 200; ++i)
        kept.emplace_back(AF_INET, SOCK_DGRAM);
    std::atomic<bool> isOver = false;
    std::thread others([&] {
        while (!isOver)
            const BoundSocket passing(AF_INET, SOCK_DGRAM);
    });
    uint64_t repeated = 0;
    for (int reading = 0; reading < 20; ++reading) {
        std::set<uint64_t> found;
        for (const InetSocket &socket : ReadInetSockets(0))
            repeated += socket.inode != 0 && !found.insert(socket.inode).second;
    }
    isOver = true;
    others.join();
    EXPECT_EQ(repeated, 0U);
}

TEST_F(Listen, JudgesCertificates) {
    // An authority with its list, a server and a device, below the folder of the certificates.
    WriteFile(tls_ + "/index", "");
    WriteFile(tls_ + "/config", "[ca]\ndefault_ca=d\n[d]\ndatabase=index\ndefault_md=sha256\n");
    WriteFile(tls_ + "/serverAuth", "extendedKeyUsage=serverAuth\n");
    WriteFile(tls_ + "/clientAuth", "extendedKeyUsage=clientAuth\n");
    Shell(R"(cd etc/kelosyslog/tls; exec 2>/dev/null
        new="-newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes"
        authority() {
            openssl req -x509 $new -keyout $1.key -out $1.pem -days 3650 -subj /CN=$1
            openssl ca -config config -gencrl -keyfile $1.key -cert $1.pem -crldays 90 -out $1.crl
        }
        certificate() { # NAME DAYS USE
            openssl req $new -keyout $1.key -subj /CN=$1 -out request
            openssl x509 -req -in request -CA ca.pem -CAkey ca.key -CAcreateserial -days $2 -out $1.pem -extfile $3
        }
        authority ca; authority foreign; mv ca.crl crl.pem
        certificate server 365 serverAuth; certificate short 9 serverAuth; certificate old -1 serverAuth
        certificate device 365 clientAuth; chmod 600 *.key)");
    const std::tuple<const char *, const char *, const char *> changes[] = {
        {"true", "", ""},
        {"cp short.pem server.pem; cp short.key server.key", "", "server.pem expires on "},
        {"cp old.pem server.pem; cp old.key server.key", "server.pem expired on ", ""},
        {"cp device.pem server.pem; cp device.key server.key", "server.pem is no certificate of a server",
         ""},
        {"cp device.key server.key", "server.key is not the key of ", ""},
        {"chmod 644 server.key", "", "server.key can be read by others"},
        {"openssl ec -in device.key -aes128 -passout pass:x -out server.key 2>/dev/null",
         "server.key has no key without a password", ""},
        {"rm ca.pem; mkdir ca.pem", "ca.pem is a folder", ""},
        {"cp device.pem ca.pem", "ca.pem has a certificate that is not one of an authority", ""},
        {"cp foreign.crl crl.pem", "crl.pem has no list of an authority in ", ""},
        {"cp server.pem crl.pem", "crl.pem has no list of revoked certificates", ""},
        {"rm crl.pem", "crl.pem cannot be read: No such file", ""},
    };
    for (const auto &[script, fault, warning] : changes) {
        Shell("rm -rf changed; cp -r etc/kelosyslog/tls changed; cd changed; " + std::string(script));
        const TlsFiles files = InspectTlsFiles(root_.File("changed"), std::time(nullptr));
        const std::string faults = files.faults.empty() ? "" : files.faults.front();
        const std::string warnings = files.warnings.empty() ? "" : files.warnings.front();
        EXPECT_THAT(faults, HasSubstr(fault)) << script;
        EXPECT_EQ(faults.empty(), *fault == '\0') << script << faults;
        EXPECT_THAT(warnings, HasSubstr(warning)) << script;
        EXPECT_EQ(warnings.empty(), *warning == '\0') << script << warnings;
    }
    const int64_t later = std::time(nullptr) + int64_t{86400} * 91;
    EXPECT_THAT(InspectTlsFiles(tls_, later).faults, ElementsAre(HasSubstr("crl.pem is out of date since ")));
    // syslog-ng finds the lists under the names that openssl gives.
    Expect("listen --tls on --plain off", 0);
    Shell("cd etc/kelosyslog/tls; test crl/$(openssl crl -in crl.pem -noout -hash).r0 -ef crl.pem");
}

} // namespace
} // namespace kelo::test
