#pragma once

#include <sys/types.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace kelo::tool {

// The counters of one of syslog-ng's sources or destinations since its start. A counter that syslog-ng does
// not keep is 0.
struct SyslogNgCounters {
    std::string driver;   // "dst.sql"; "source" for all drivers of a source
    std::string id;       // "d_kelo_database#0"
    std::string instance; // the file, the address
    uint64_t processed = 0;
    uint64_t written = 0;
    uint64_t dropped = 0;
    uint64_t queued = 0;
    uint64_t memory = 0;  // bytes queued in memory
    bool isStuck = false; // messages are queued, and none was written for longer than a batch may wait
};

// Reads the answer to "STATS" (syslog-ng-ctl(1)): the sources as a whole and the drivers of destinations, in
// the order of their ids. Counters of objects that a reload or a closed connection removed are left out.
std::vector<SyslogNgCounters> ParseSyslogNgCounters(const std::string &text);

struct SyslogNgStatus {
    // Running: it answers. Silent: it listens and does not answer. Unknown: no permission to ask.
    enum class State { Running, Silent, Stopped, Unknown };
    State state = State::Unknown;
    std::string control; // the path of its control socket
    pid_t pid = 0;       // 0 when unknown, as the next
    int64_t since = 0;   // seconds since the epoch
    std::string problem; // why there are no counters; "" when there are
    std::vector<SyslogNgCounters> sources;
    std::vector<SyslogNgCounters> destinations;
    // Counted by the shipped configuration: messages that its rate limit dropped, and connections over TLS
    // whose handshake failed.
    uint64_t aboveRate = 0;
    uint64_t refusedTls = 0;

    uint64_t Received() const;
    uint64_t Dropped() const;
};

// Asks the syslog-ng whose files are below `root`, in Debian's places, or the one with this control socket if
// `control` is not empty. Without permission for the socket, the pid file shows whether it runs. While a
// destination has messages queued it asks again, for a second and a half at most, until some were written.
SyslogNgStatus GatherSyslogNg(const std::string &root, const std::string &control,
                              std::chrono::milliseconds timeout);

} // namespace kelo::tool
