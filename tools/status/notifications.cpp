#include "status/notifications.h"

#include <algorithm>
#include <cerrno>

namespace kelo::tool {
namespace {

// The time of the first of these entries that can be read; others may be delivered at this moment.
int64_t TimeOfFirst(const Spool &spool, const std::vector<std::string> &ids) {
    constexpr size_t kMostTried = 20;
    for (size_t i = 0; i < std::min(ids.size(), kMostTried); ++i) {
        try {
            return spool.ReadNew(ids[i]).time;
        } catch (const std::runtime_error &) { // damaged, or gone
        }
    }
    return 0;
}

} // namespace

NotificationStatus GatherNotifications(const std::string &root) {
    const Spool spool(root);
    NotificationStatus status;
    status.path = spool.Path();
    try {
        const std::vector<std::string> ids = spool.NewIds();
        status.waiting = ids.size();
        status.failed = spool.FailedIds().size();
        status.oldest = TimeOfFirst(spool, ids);
        // The settings hold passwords. For a user who may not read them nothing is known of the channels.
        const Settings settings(root);
        if (settings.IsReadable() || errno != EACCES)
            status.channels = ReadChannelHealth(spool, settings);
    } catch (const SpoolError &error) {
        status.problem = error.what();
    }
    return status;
}

} // namespace kelo::tool
