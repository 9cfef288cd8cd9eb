// The server's own events: added, counted, paged and exported.

#include <kelosyslog/logger.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <ctime>
#include <fstream>
#include <iostream>

// A clock set by hand, so that this program prints the same whenever it runs. Yours needs none.
static time_t now = 1577931072;
extern "C" time_t time(time_t *result) noexcept {
    return result != nullptr ? *result = now : now;
}

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1];
    const std::string path = root + "/usr/kelo/etc/kelosyslog.db"; // the server's own event database

    Logger logger; // holds no state: each call opens the database and closes it
    std::cout << "start: " << logger.LogAddServStart("1.0") << "\n";
    ++now;
    std::cout << "archive: " << logger.LogAddArchFailed("archive.db") << "\n";
    std::cout << "rule: " << logger.LogAddNotifySev(SYSLOG_PRIO_CRIT, "disk failed") << "\n";
    ++now;
    std::cout << "one's own: " << logger.LogAdd(path, 1, "alice", "changed <b>the</b> rules") << "\n";

    std::cout << logger.LogCount(path) << " events, the newest two:\n";
    for (const _SSYSLOG_LOG_LOG_tag &event : logger.LogEnum(path, 0, 2)) // after 0, at most 2
        std::cout << "  " << event.time << " " << strLevelGet(event.level) << " " << event.user << ": "
                  << event.event << "\n";

    std::cout << "page: " << logger.LogHtmlGen(path, "unused", root + "/events.html") << "\n";
    std::cout << std::ifstream(root + "/events.html").rdbuf(); // markup in an event is not escaped
    std::cout << "removed: " << logger.LogHtmlRemove(root + "/events.html") << ", once more: ";
    std::cout << logger.LogHtmlRemove(root + "/events.html") << "\n";
    std::cout << "a relative path: " << logger.LogCount("events.db") << "\n";
}
