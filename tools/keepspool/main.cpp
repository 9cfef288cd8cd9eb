// keep-spool: keeps the message spool within its bounds. syslog-ng starts it as a source and takes its output
// as messages.

#include <sys/stat.h>
#include <unistd.h>

#include <charconv>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <ctime>
#include <string_view>
#include <thread>

#include "keepspool/spool_keeper.h"

namespace {

bool Read(std::string_view text, uint64_t &number) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size() && number > 0;
}

} // namespace

int main(int argc, char **argv) {
    kelo::tool::SpoolKeeper::Limits limits;
    if (argc != 5 || !Read(argv[3], limits.bytes) || !Read(argv[4], limits.spare)) {
        std::fprintf(stderr, "usage: keep-spool FOLDER FOLDER-OF-THE-RECEIVER BYTES SPARE-BYTES\n");
        return 2;
    }
    umask(027);
    std::signal(SIGIO, SIG_IGN); // somebody opens a file at the moment of a lease
    kelo::tool::SpoolKeeper keeper(argv[1], argv[2], limits);
    // A new parent: the syslog-ng that started this one is gone.
    for (const pid_t parent = getppid(); getppid() == parent;) {
        if (const std::string line = keeper.Step(std::time(nullptr)); !line.empty()) {
            std::printf("<28>kelosyslog: %s\n", line.c_str());
            std::fflush(stdout);
        }
        std::this_thread::sleep_for(std::chrono::seconds(1));
    }
    return 0;
}
