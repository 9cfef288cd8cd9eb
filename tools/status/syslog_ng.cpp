#include "status/syslog_ng.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <fstream>
#include <map>
#include <sstream>
#include <thread>
#include <tuple>

#include "status/control_socket.h"
#include "status/process.h"

namespace kelo::tool {
namespace {

constexpr const char *kControl = "/var/lib/syslog-ng/syslog-ng.ctl";
// The first is the init script's, the second the daemon's default.
constexpr const char *kPidFiles[] = {"/run/syslog-ng.pid", "/var/lib/syslog-ng/syslog-ng.pid"};
constexpr const char *kSyslogNg = "syslog-ng";

// The fields of a line; one with a semicolon is in double quotes, with a backslash before each quote of its
// own.
std::vector<std::string> SplitLine(const std::string &line) {
    std::vector<std::string> fields(1);
    bool isQuoted = false;
    for (size_t i = 0; i < line.size(); ++i) {
        if (line[i] == '"' && (isQuoted || fields.back().empty()))
            isQuoted = !isQuoted;
        else if (line[i] == ';' && !isQuoted)
            fields.emplace_back();
        else if (line[i] == '\\' && isQuoted && i + 1 < line.size())
            fields.back() += line[++i];
        else
            fields.back() += line[i];
    }
    return fields;
}

uint64_t *CounterOf(SyslogNgCounters &counters, const std::string &type) {
    const std::pair<const char *, uint64_t *> known[] = {{"processed", &counters.processed},
                                                         {"written", &counters.written},
                                                         {"dropped", &counters.dropped},
                                                         {"queued", &counters.queued},
                                                         {"memory_usage", &counters.memory}};
    for (const auto &[name, counter] : known) {
        if (type == name)
            return counter;
    }
    return nullptr;
}

// The process that a pid file names, when it is syslog-ng.
pid_t PidFromFile(const std::string &root) {
    for (const char *path : kPidFiles) {
        pid_t pid = 0;
        std::ifstream(root + path) >> pid;
        if (pid > 0 && ProcessName(pid) == kSyslogNg)
            return pid;
    }
    return 0;
}

SyslogNgStatus::State StateOf(const ControlAnswer &answer, pid_t pid) {
    using State = SyslogNgStatus::State;
    if (answer.connectError == 0)
        return answer.problem.empty() ? State::Running : State::Silent;
    if (answer.connectError == EAGAIN) // no process accepts the waiting connections
        return State::Silent;
    if (pid != 0)
        return State::Running;
    const bool isAbsent = answer.connectError == ENOENT || answer.connectError == ECONNREFUSED;
    return isAbsent ? State::Stopped : State::Unknown;
}

using Destinations = std::vector<SyslogNgCounters>;

// The shipped configuration sends what it only counts to destinations that store nothing.
uint64_t CountSentTo(const std::string &destination, const std::string &text) {
    const std::string counter = "\ndestination;" + destination + ";;a;processed;";
    const size_t at = text.find(counter);
    return at == std::string::npos ? 0 : std::strtoull(text.c_str() + at + counter.size(), nullptr, 10);
}

// Takes the sources and destinations out of an answer.
void ReadCounters(const std::string &text, SyslogNgStatus &status) {
    status.sources.clear();
    status.destinations.clear();
    for (SyslogNgCounters &counters : ParseSyslogNgCounters(text))
        (counters.driver == "source" ? status.sources : status.destinations).push_back(std::move(counters));
    status.aboveRate = CountSentTo("d_kelo_above_rate", text);
    status.refusedTls = CountSentTo("d_kelo_tls_refused", text);
}

bool HasWritten(const SyslogNgCounters &now, const Destinations &before) {
    const auto same = std::find_if(before.begin(), before.end(), [&](const SyslogNgCounters &other) {
        return other.driver == now.driver && other.id == now.id && other.instance == now.instance;
    });
    return same == before.end() || now.written != same->written;
}

// Marks the destinations that stay stuck. The counters are then those of the last answer.
void FindStuck(SyslogNgStatus &status, std::chrono::milliseconds timeout) {
    constexpr std::chrono::milliseconds kPause{100};
    constexpr int kTries = 15; // longer than a batch of the shipped configuration waits
    const Destinations before = status.destinations;
    for (int i = 0;; ++i) {
        bool isAnyStuck = false;
        for (SyslogNgCounters &destination : status.destinations) {
            destination.isStuck = destination.queued > 0 && !HasWritten(destination, before);
            isAnyStuck = isAnyStuck || destination.isStuck;
        }
        if (!isAnyStuck || i == kTries)
            return;
        std::this_thread::sleep_for(kPause);
        const ControlAnswer answer = AskControlSocket(status.control, "STATS", timeout);
        if (!answer.problem.empty() || answer.connectError != 0)
            return;
        ReadCounters(answer.text, status);
    }
}

} // namespace

std::vector<SyslogNgCounters> ParseSyslogNgCounters(const std::string &text) {
    std::map<std::tuple<std::string, std::string, std::string>, SyslogNgCounters> found;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        const std::vector<std::string> fields = SplitLine(line);
        if (fields.size() != 6 || fields[3] == "o" ||
            (fields[0] != "source" && !fields[0].starts_with("dst.")))
            continue;
        SyslogNgCounters &counters = found[{fields[0], fields[1], fields[2]}];
        std::tie(counters.driver, counters.id, counters.instance) = std::tie(fields[0], fields[1], fields[2]);
        if (uint64_t *counter = CounterOf(counters, fields[4]))
            std::from_chars(fields[5].data(), fields[5].data() + fields[5].size(), *counter);
    }
    std::vector<SyslogNgCounters> all;
    all.reserve(found.size());
    for (auto &[key, counters] : found)
        all.push_back(std::move(counters));
    return all;
}

uint64_t SyslogNgStatus::Received() const {
    uint64_t sum = 0;
    for (const SyslogNgCounters &source : sources)
        sum += source.processed;
    return sum;
}

uint64_t SyslogNgStatus::Dropped() const {
    uint64_t sum = 0;
    for (const SyslogNgCounters &destination : destinations)
        sum += destination.dropped;
    return sum;
}

SyslogNgStatus GatherSyslogNg(const std::string &root, const std::string &control,
                              std::chrono::milliseconds timeout) {
    SyslogNgStatus status;
    status.control = control.empty() ? root + kControl : control;
    const ControlAnswer answer = AskControlSocket(status.control, "STATS", timeout);
    // Another control socket belongs to another syslog-ng than the pid files.
    const pid_t fromFile = control.empty() ? PidFromFile(root) : 0;
    status.pid = answer.pid != 0 ? answer.pid : fromFile;
    status.state = StateOf(answer, status.pid);
    status.problem = answer.problem;
    status.since = status.pid != 0 ? ProcessStart(status.pid) : 0;
    ReadCounters(answer.text, status);
    FindStuck(status, timeout);
    return status;
}

} // namespace kelo::tool
