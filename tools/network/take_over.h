#pragma once

#include <sys/types.h>

#include <functional>
#include <string>

#include "network/settings.h"

namespace kelo::tool {

// What syslog-ng needs to take changed settings over.
enum class Step { kNone, kReload, kRestart };

// syslog-ng keeps a listener over a reload, so an address or a port that one of its sockets has needs a
// restart, and so does one (`syslogNg`) that does not listen as its files say.
Step NeededStep(const NetworkSettings &before, const NetworkSettings &after, pid_t syslogNg);

struct TakeOver {
    std::string root;
    NetworkSettings before;
    NetworkSettings after;
    Step step = Step::kNone;
    std::function<pid_t()> findSyslogNg; // its process; 0 when it does not run
};

// Throws UsageError with syslog-ng's reason if it refuses its configuration with the settings `after`, or for
// another reason than those before. Changes nothing.
void RequireAccepted(const std::string &root, const NetworkSettings &before, const NetworkSettings &after);

// Writes the settings, lets syslog-ng take the step and waits until it has their sockets and none of those
// before. If that does not happen, the earlier file is restored and syslog-ng restarted, and OutputError has
// the reason.
void ApplySettings(const TakeOver &change);

} // namespace kelo::tool
