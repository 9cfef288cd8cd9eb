// The rules that decide on notifications: written, read back and checked.

#include <kelosyslog/notification.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <filesystem>
#include <fstream>
#include <iostream>

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::filesystem::path path = std::string(argv[1]) + "/etc/kelosyslog/notify.conf";
    std::filesystem::create_directories(path.parent_path());

    _SYSLOG_NOTIFY_RULES_tag rules[] = {{"worst", 0, SYSLOG_PRIO_CRIT, 0, "", true},
                                        {"flood", 1, SYSLOG_PRIO_EMERG, 500, "", true},
                                        {"disk", 2, SYSLOG_PRIO_EMERG, 0, "disk full", true}};
    for (_SYSLOG_NOTIFY_RULES_tag &rule : rules) // each is on the disk when the call returns
        std::cout << "stored " << rule.name << ": " << SyslogNotifyConfSet(path, rule.name, rule) << "\n";
    rules[2].pattern = "two\nlines";
    std::cout << "a line feed: " << SyslogNotifyConfSet(path, "disk", rules[2]) << "\n";

    _SYSLOG_NOTIFY_RULES_tag read;
    std::cout << "read: " << SyslogNotifyConfGet(path, "disk", read) << " [" << read.pattern << "]\n";
    std::cout << std::ifstream(path).rdbuf();

    const NotificationManager manager; // loads the file now: later changes need a new manager
    std::cout << "crit: " << manager.CheckSev(SYSLOG_PRIO_CRIT)
              << ", err: " << manager.CheckSev(SYSLOG_PRIO_ERR) << ", 499: " << manager.CheckEps(499)
              << ", 500: " << manager.CheckEps(500) << "\n";
    std::cout << "[" << manager.CheckKeyword("nas: disk full on /volume1") << "] ["
              << manager.CheckKeyword("Disk Full") << "]\n"; // byte by byte: case-sensitive
}
