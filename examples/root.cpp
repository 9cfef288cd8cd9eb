// Puts every fixed path of both libraries under one folder, and shows where the files are.

#include <keloplatform/root.h>
#include <kelosyslog/logger.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <filesystem>
#include <iostream>

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER); // also shows the messages to the system log
    const std::filesystem::path root = argv[1];

    std::cout << "a relative root: " << SyslogRootSet("relative/folder") << "\n";
    std::cout << "an absolute one: " << SyslogRootSet(root) << " " << KELORootSet(root.c_str()) << "\n";

    // A fixed path of the library: it is under the root from now on.
    std::cout << "event added: " << Logger().LogAddServStart("1.0") << "\n";
    // A path of the caller is used unchanged, so the caller prefixes the root.
    std::cout << "events: " << Logger().LogCount(root / "usr/kelo/etc/kelosyslog.db") << "\n";

    for (const auto &entry : std::filesystem::recursive_directory_iterator(root))
        if (entry.path().extension() == ".db")
            std::cout << entry.path().string() << "\n";
}
