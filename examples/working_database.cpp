// Maintains the database that syslog-ng appends to: write-ahead logging, and a limit of its size.

#include <keloplatform/root.h>
#include <kelosyslog/dbhandler.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <filesystem>
#include <iostream>

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0 || KELORootSet(argv[1]) != 0)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1];
    const std::string path = root + "/var/log/kelosyslog/logs.db";
    DBHandler db(path, root + "/usr/kelo/syslog/schema/logs.sql");
    if (db.DBCreate() != 0)
        return 1;
    std::cout << "journal mode set: " << SyslogngWorkingDbSetJouWal(path) << "\n";

    std::cout << "below a limit of 1 MiB: " << SyslogngWorkingDbCheck(path, 1024)
              << ", still there: " << std::filesystem::exists(path) << "\n";
    // A file that is larger than its limit is deleted. syslog-ng is then asked to start a new one; here none
    // runs, so the log reports a failure, which does not change the result.
    std::cout << "above a limit of 4 KiB: " << SyslogngWorkingDbCheck(path, 4)
              << ", still there: " << std::filesystem::exists(path) << "\n";

    std::cout << "no such file: " << SyslogngWorkingDbCheck(path, 4) << "\n";
    std::cout << "a folder: " << SyslogngWorkingDbCheck(root, 4) << "\n";
}
