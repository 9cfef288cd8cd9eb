// Sends notifications, and replaces the appliance's notification service to show them.

#include <keloplatform/kelonotify.h>
#include <keloplatform/torvc.h>
#include <kelosyslog/notification.h>
#include <kelosyslog/root.h>
#include <syslog.h>

#include <iostream>

// A program that defines a platform function itself replaces it, also for calls from libkelosyslog.
int KELOSysNotifySendNotificationCustomized(const char *tag, const char *, const char *, TORVSZHASH **hash,
                                            int) {
    std::cout << "  " << tag;
    for (const char *key : {"%HOST%", "%SEV%", "%KEYWORD%", "%EPS%", "%TOLERNCE%", "%SHARED_FOLDER%",
                            "%SYSLOG_CONTENT%", "DESKTOP_NOTIFY_CLASSNAME"})
        if (const char *value = TORVCSzHashGetValue(*hash, key); value != nullptr)
            std::cout << "\n    " << key << " = " << value;
    std::cout << "\n";
    return 0; // below 0: the senders below would return -1 after a report
}

void Print(const char *what, int result) {
    std::cout << what << ": " << result << "\n";
}

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);

    NotificationManager manager; // there is no rule file: every check fails, sending works
    _SYSLOG_LOG_DATA_tag log;
    log.host = "nas";
    log.prio = SYSLOG_PRIO_CRIT;
    log.msg = R"(disk "sda" failed)";
    Print("severity", manager.NotificationSendSev(log.host, log.prio, log));
    Print("rate", manager.NotificationSendEps(700));
    Print("volume", manager.NotificationSendVolFull("logs"));

    // A record about a failed notification causes no other, with result 0; one that is too long is refused.
    Print("loop", manager.NotificationSendKeyword("nas", "mail", "Failed to send email."));
    Print("long", manager.NotificationSendKeyword("nas", "x", std::string(2048, 'x')));
}
