// A notification service of one's own, in a shared library that stands before libkelosyslog on the command
// line of the linker.

#include <keloplatform/kelonotify.h>
#include <keloplatform/torvc.h>

#include <iostream>

namespace {

int PrintValue(const char *key, const char *value, void *) {
    std::cout << "  " << key << " = " << value << "\n";
    return 0;
}

} // namespace

int KELOSysNotifySendNotificationCustomized(const char *tag, const char *, const char *, TORVSZHASH **hash,
                                            int) {
    std::cout << tag << "\n";
    TORVCSzHashWalk(*hash, PrintValue, nullptr);
    return 0;
}
