// How long after it was sent over TCP a message can be found in the log database.
//
// usage: send_to_search PORT DATABASE COUNT
//
// Sends COUNT messages, one after the other was found, to a syslog daemon on loopback. Prints the median, the
// 99th percentile and the longest time in milliseconds.

#include <arpa/inet.h>
#include <sqlite3.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "support/measure.h"

using namespace kelo::bench;

namespace {

using Clock = std::chrono::steady_clock;

constexpr auto kLookEvery = std::chrono::milliseconds(1);
constexpr auto kLongest = std::chrono::seconds(60);

int Connect(uint16_t port) {
    const int connection = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (connection < 0 || connect(connection, reinterpret_cast<sockaddr *>(&address), sizeof address) != 0)
        Fail("nothing listens on port " + std::to_string(port));
    return connection;
}

// Finds messages among the rows that came since it looked last.
class Finder {
public:
    explicit Finder(const std::string &path) {
        sqlite3 *database = nullptr;
        const int status = sqlite3_open_v2(path.c_str(), &database, SQLITE_OPEN_READWRITE, nullptr);
        database_.reset(database);
        if (status != SQLITE_OK)
            Fail("cannot open " + path);
        sqlite3_busy_timeout(database, 5000);
    }

    bool Finds(const std::string &message) {
        sqlite3_stmt *statement = nullptr;
        if (sqlite3_prepare_v2(database_.get(), "SELECT id FROM logs WHERE id > ? AND msg = ?", -1,
                               &statement, nullptr) != SQLITE_OK)
            return false; // the table is not there yet
        sqlite3_bind_int64(statement, 1, last_);
        sqlite3_bind_text(statement, 2, message.c_str(), -1, SQLITE_TRANSIENT);
        const bool found = sqlite3_step(statement) == SQLITE_ROW;
        if (found)
            last_ = sqlite3_column_int64(statement, 0);
        sqlite3_finalize(statement);
        return found;
    }

private:
    struct Close {
        void operator()(sqlite3 *database) const { sqlite3_close(database); }
    };
    std::unique_ptr<sqlite3, Close> database_;
    int64_t last_ = 0;
};

} // namespace

int main(int argc, char **argv) {
    if (argc != 4)
        Fail("usage: send_to_search PORT DATABASE COUNT");
    const int connection = Connect(static_cast<uint16_t>(std::atoi(argv[1])));
    Finder finder(argv[2]);
    const int count = std::atoi(argv[3]);

    std::vector<double> times;
    for (int number = 0; number < count; ++number) {
        const std::string message = "message " + std::to_string(number) + " of " + std::to_string(getpid());
        const std::string line = "<14>Jan  1 00:00:00 bench latency: " + message + "\n";
        const auto sent = Clock::now();
        if (write(connection, line.data(), line.size()) != static_cast<ssize_t>(line.size()))
            Fail("the connection was closed");
        while (!finder.Finds(message)) {
            if (Clock::now() - sent > kLongest)
                Fail("message " + std::to_string(number) + " was not found within a minute");
            std::this_thread::sleep_for(kLookEvery);
        }
        times.push_back(std::chrono::duration<double, std::milli>(Clock::now() - sent).count());
    }
    close(connection);
    std::sort(times.begin(), times.end());
    std::printf("%.0f %.0f %.0f\n", times[times.size() / 2], times[times.size() * 99 / 100], times.back());
}
