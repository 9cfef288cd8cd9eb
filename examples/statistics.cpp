// Reads the counts of the accounting, and the distinct values of a column.

#include <kelosyslog/dbutil.h>
#include <syslog.h>

#include <iostream>

#include "modern.h"

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1], schemas = root + "/usr/kelo/syslog/schema/";

    const std::string accounting = root + "/accounting.db";
    Database samples(accounting, schemas + "accinfo.sql");
    samples->DBExecute("INSERT INTO histogram (device, count) VALUES ('nas', 700), ('web1', 40), ('tv', 2)");
    samples->DBExecute("INSERT INTO eps (stamp, device, eps) VALUES"
                       " (1577931072, 'nas', 30), (1577931072, 'web1', 4), (1577931073, 'nas', 2)");

    std::cout << "all devices: " << SyslogDBHistTotalGet(accounting)
              << ", web1: " << SyslogDBHistGetSingle(accounting, "web1") << "\n";
    for (const auto &[device, count] : SyslogDBHistGet(accounting, 2)) // the two busiest, by name
        std::cout << "  " << device << " " << count << "\n";
    for (const auto &[stamp, sample] : SyslogDBEpsGet(accounting, 1577931072, 1577931073)) {
        std::cout << stamp << ": " << sample.eps << " logs";
        for (const auto &[device, count] : sample.devices)
            std::cout << ", " << device << " " << count;
        std::cout << "\n";
    }

    const std::string logs = root + "/logs.db";
    Database db(logs, schemas + "logs.sql");
    db->DBExecute("INSERT INTO logs (host, prog) VALUES ('web1', 'sshd'), ('nas', 'cron'), ('nas', 'sshd')");
    std::list<std::string> hosts;
    SyslogDBAttriValueGet(logs, "host", nullptr, hosts);
    for (const std::string &host : hosts)
        std::cout << "host " << host << "\n";
    std::map<uint64_t, std::string> programs; // a database without keys numbers its names in their order
    SyslogDBExtkeyMapGet(logs, SYSLOG_EXTKEY_PROG, programs);
    for (const auto &[key, program] : programs)
        std::cout << "program " << key << " " << program << "\n";
    std::cout << "generation " << SyslogDBVersionGet(logs) << "\n"; // 1 has names by key, 2 as texts
    std::cout << "no such column: " << SyslogDBAttriValueGet(logs, "colour", nullptr, hosts) << "\n";
    std::cout << "no such database: " << SyslogDBHistTotalGet(root + "/missing.db") << "\n";
}
