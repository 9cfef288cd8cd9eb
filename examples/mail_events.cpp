// Notifications without a rule, sent through the real service of plain Linux to its spool.

#include <keloplatform/root.h>
#include <keloplatform/torvc.h>
#include <kelosyslog/notification.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <filesystem>
#include <fstream>
#include <iostream>

namespace fs = std::filesystem;

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0 || KELORootSet(argv[1]) != 0)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);
    const std::string root = argv[1];
    std::cout << "settings missing: " << IsNotificationSet() << "\n";
    fs::create_directories(root + "/etc");
    std::ofstream(root + "/etc/keloinfo.conf") << "smtp_mail_enabled=\"yes\"\n"
                                                  "smtp_server=\"mail.example.com\"\n"
                                                  "smtp_to=\"admin@example.com\"\n"
                                                  "pushservice_mobile_enabled=\"no\"\n"
                                                  "pushservice_msn_enabled=\"no\"\n"
                                                  "pushservice_skype_enabled=\"no\"\n";
    std::cout << "any channel on: " << IsNotificationSet() << "\n";

    std::cout << "share removed: " << SyslogMailShareRemove("logs") << "\n";
    std::cout << "severity: " << SyslogMailSeverityExceeded("crit", "disk failed") << "\n";
    std::cout << "no share: " << SyslogMailShareRemove(nullptr) << "\n";

    // Another tag with its placeholders: the map stays the caller's.
    TORVSZHASH *values = TORVCSzHashAlloc(1);
    TORVCSzHashSetValue(&values, "%SHARED_FOLDER%", "backup");
    std::cout << "own values: " << SyslogMailSend("KELOSYSLOG_VOL_FULL", &values) << "\n";
    TORVCSzHashFree(values);

    // They are on the disk for kelonotify, which delivers them; no call waited for a network.
    int spooled = 0;
    for (const fs::directory_entry &entry : fs::recursive_directory_iterator(root + "/var/spool/kelonotify"))
        spooled += entry.is_regular_file() && entry.file_size() > 0;
    std::cout << "in the spool: " << spooled << "\n";
}
