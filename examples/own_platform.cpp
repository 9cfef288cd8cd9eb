// Runs on a platform of one's own: the notification service of platform/notification_service.cpp.

#include <dlfcn.h>
#include <keloplatform/kelonotify.h>
#include <keloplatform/torvc.h>
#include <kelosyslog/notification.h>
#include <kelosyslog/root.h>

#include <iostream>

// The library that has taken a function of the platform. A replacement is not used when its library is
// missing from the program or comes too late, and nothing reports that: check it when the program starts.
template <typename Function>
std::string LibraryOf(Function *function) {
    Dl_info info{};
    if (dladdr(reinterpret_cast<void *>(function), &info) == 0)
        return "unknown";
    const std::string path = info.dli_fname;
    return path.substr(path.rfind('/') + 1);
}

int main(int argc, char **argv) {
    if (argc != 2 || SyslogRootSet(argv[1]) != 0)
        return 2;
    const std::string service = LibraryOf(KELOSysNotifySendNotificationCustomized);
    std::cout << "notifications: " << service << "\n";
    std::cout << "maps and files: " << LibraryOf(TORVCSzHashAlloc) << "\n";
    if (service != "libexample_platform.so")
        return 1;
    return NotificationManager().NotificationSendVolFull("logs") == 0 ? 0 : 1;
}
