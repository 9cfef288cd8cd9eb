// Records on their way into a cluster and out of it: each arrives once and unchanged, whatever breaks.

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>

#include <atomic>
#include <thread>

#include "base/files.h"
#include "platform/db_fixture.h"
#include "servers.h"
#include "support/test.h"

namespace kelo::test {
namespace {

constexpr int kRows = 25'000; // three blocks

// Texts of every kind, sparse and negative ids, and times that are none.
void CreateSource(const std::string &path) {
    CreateLogDatabase(path);
    RunSql(path,
           "WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i < " +
               std::to_string(kRows - 1) +
               ") INSERT INTO logs SELECT i * 200 - 1000, 'host' || (i % 7), NULLIF('10.0.0.1', i % 9), "
               "'user', 'err', 'err', '', CASE i % 9000 WHEN 5 THEN NULL WHEN 6 THEN -7 WHEN 7 THEN "
               "'then' WHEN 8 THEN 1 << 40 ELSE 1600000000 + i * 90 END, '+02:00', '2020/09/13', "
               "'14:26:40', 'prog', CASE i % 1000 WHEN 1 THEN 'it''s \\ 100%\\N \\0' || char(9, 10, 13) "
               "WHEN 2 THEN 'nul' || char(0) || 'in' WHEN 3 THEN CAST(x'fffe41e900' AS TEXT) WHEN 4 "
               "THEN printf('%070000d', i) WHEN 9 THEN NULL WHEN 10 THEN '' ELSE 'message ' || i END "
               "FROM n");
}

// The rows as a cluster has them, with a number for equal ones; those that only one database has.
std::string Difference(const std::string &one, const std::string &other) {
    const auto rows = [](const std::string &logs) {
        const std::string columns = "host, ifnull(ip, ''), fac, prio, llevel, tag, CAST(ifnull(utcsec, 0) AS "
                                    "INTEGER), tzoffset, ldate, ltime, prog, hex(ifnull(msg, ''))";
        return "SELECT " + columns + ", row_number() OVER (PARTITION BY " + columns + ") FROM " + logs;
    };
    const auto only = [&](const char *first, const char *second) {
        return "(SELECT count(*) FROM (" + rows(first) + " EXCEPT " + rows(second) + "))";
    };
    return RunSql(one, "ATTACH '" + other + "' AS other; SELECT " + only("logs", "other.logs") +
                           " || ' ' || " + only("other.logs", "logs"));
}

sockaddr_in AddressOf(uint32_t host, int port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(host);
    address.sin_port = htons(static_cast<uint16_t>(port));
    return address;
}

// Passes requests on to a server, and loses the answers to the first INSERTs.
class LosingServer {
public:
    LosingServer(const sockaddr_in &server, int losses) : server_(server), losses_(losses) {
        sockaddr_in address = AddressOf(INADDR_LOOPBACK, 0);
        socklen_t size = sizeof address;
        if (bind(listener_.Get(), reinterpret_cast<sockaddr *>(&address), size) != 0 ||
            listen(listener_.Get(), 5) != 0 ||
            getsockname(listener_.Get(), reinterpret_cast<sockaddr *>(&address), &size) != 0)
            ADD_FAILURE() << "no socket";
        port_ = ntohs(address.sin_port);
        thread_ = std::thread([this] { Serve(); });
    }
    ~LosingServer() {
        shutdown(listener_.Get(), SHUT_RDWR);
        thread_.join();
    }
    std::string Url() const { return "http://127.0.0.1:" + std::to_string(port_); }
    int LossesLeft() const { return losses_; }

private:
    // Each connection has one request.
    void Serve() {
        for (int file; (file = accept(listener_.Get(), nullptr, nullptr)) >= 0;) {
            const tool::FileHandle client(file);
            const tool::FileHandle server(socket(AF_INET, SOCK_STREAM, 0));
            if (connect(server.Get(), reinterpret_cast<sockaddr *>(&server_), sizeof server_) != 0)
                continue;
            bool isInsert = false;
            pollfd sides[] = {{client.Get(), POLLIN, 0}, {server.Get(), POLLIN, 0}};
            for (bool isOpen = true; isOpen && poll(sides, 2, -1) > 0;) {
                const bool isAnswer = sides[0].revents == 0;
                char bytes[65536];
                const ssize_t size = recv(sides[isAnswer ? 1 : 0].fd, bytes, sizeof bytes, 0);
                const std::string_view text(bytes, static_cast<size_t>(std::max<ssize_t>(size, 0)));
                isInsert =
                    isInsert || (!isAnswer && text.find("INSERT INTO logs_shard") != std::string_view::npos);
                isOpen = size > 0 && !(isAnswer && isInsert && losses_-- > 0) &&
                         send(sides[isAnswer ? 0 : 1].fd, bytes, text.size(), MSG_NOSIGNAL) == size;
            }
        }
    }

    sockaddr_in server_;
    std::atomic<int> losses_;
    tool::FileHandle listener_{socket(AF_INET, SOCK_STREAM, 0)};
    int port_ = 0;
    std::thread thread_;
};

TEST(ClusterTransfer, MovesEveryRecordOnceIntoTheClusterAndOut) {
    Servers &servers = *sharedServers;
    const TempRoot root;
    const std::string source = root.File("logs.db");
    CreateSource(source);
    const std::string administrator = servers.Made("cluster-admin.conf");
    const auto run = [&](const std::string &command) {
        return RunIn(root.Path(), "exec kelosyslog --root . cluster " + command);
    };
    const std::string import = "import logs.db -o json --node 250 --db ";
    // Rows, different ids and ids of the source.
    const auto found = [&] {
        return servers.Run(
            0, "SELECT count(), uniqExact(id), uniqExact(rcptid) FROM kelo.logs WHERE node = 250");
    };
    const std::string all = std::to_string(kRows);
    const std::string allOnce = all + "\t" + all + "\t" + all + "\n";

    // Another one is refused, as nothing may be inserted.
    EXPECT_THAT(run(import + servers.Made("cluster.conf")).err, HasSubstr("readonly"));
    {
        ChildProgram killed(root.Path(), "exec kelosyslog cluster " + import + administrator);
        EXPECT_TRUE(killed.Await([&] { return std::stoi(found()) > 1000; }));
    }
    LosingServer losing(AddressOf(INADDR_LOOPBACK + 1, servers.HttpPort()), 1);
    std::string description = ReadFile(administrator);
    description.replace(description.find(servers.Url(0)), servers.Url(0).size(), losing.Url());
    WriteFile(root.File("losing.conf"), description);
    fs::permissions(root.File("losing.conf"), fs::perms(0600));
    const ProgramResult first = run(import + root.File("losing.conf"));
    EXPECT_EQ(first.status, 0) << first.err;
    EXPECT_THAT(first.out, AllOf(HasSubstr("\"records\": " + all), HasSubstr("\"wrong_times\": 3")));
    EXPECT_EQ(found(), allOnce);
    EXPECT_LE(losing.LossesLeft(), 0);

    // What is missing is found, and nothing else is sent.
    servers.Run(0, "ALTER TABLE kelo.logs_shard DELETE WHERE node = 250 AND rcptid % 1000 = 0");
    while (servers.Run(0, "SELECT count() FROM system.mutations WHERE is_done = 0") != "0\n")
        std::this_thread::yield();
    const std::string gone = std::to_string(kRows - std::stoi(found()));
    EXPECT_THAT(run(import + administrator).out, HasSubstr("\"sent\": " + gone));
    EXPECT_THAT(run("import logs.db logs.db -o json --node 250 --db " + administrator).out,
                AllOf(HasSubstr("\"records\": " + std::to_string(2 * kRows)), HasSubstr("\"sent\": 0")));
    EXPECT_EQ(found(), allOnce);

    // Another log under the same number.
    fs::copy_file(source, root.File("other.db"));
    RunSql(root.File("other.db"), "DELETE FROM logs WHERE id <> 11000; UPDATE logs SET msg = 'x'");
    const ProgramResult clash = run("import other.db --node 250 --db " + administrator);
    EXPECT_EQ(clash.status, 3);
    EXPECT_THAT(clash.err, AllOf(HasSubstr("other.db"), HasSubstr("row 11000: another row has its id")));

    {
        ChildProgram killed(root.Path(), "exec kelosyslog cluster export back.db --db " + administrator);
        EXPECT_TRUE(killed.Await([&] {
            return fs::exists(root.File("back.db")) &&
                   RunSql(root.File("back.db"), "SELECT count(*) FROM sqlite_schema, logs") != "0";
        }));
    }
    const std::string out = "export back.db -o json --db " + administrator;
    EXPECT_EQ(run(out).status, 0);
    std::string others = servers.Run(0, "SELECT count() FROM kelo.logs WHERE node != 250");
    others.pop_back();
    EXPECT_EQ(Difference(source, root.File("back.db")), "0 " + others);
    EXPECT_THAT(run(out).out, HasSubstr("\"stored\": 0"));
    RunSql(root.File("back.db"),
           "DELETE FROM logs WHERE host = 'host3'; UPDATE logs SET msg = 'y' WHERE host = 'host2'");
    EXPECT_EQ(run(out).status, 0);
    EXPECT_THAT(Difference(source, root.File("back.db")), StartsWith("0 "));
}

} // namespace
} // namespace kelo::test
