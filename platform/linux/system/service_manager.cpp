#include "system/service_manager.h"

#include <systemd/sd-bus.h>

#include <chrono>
#include <cstring>
#include <memory>

namespace kelo::platform {
namespace {

constexpr char kDestination[] = "org.freedesktop.systemd1";
constexpr char kPath[] = "/org/freedesktop/systemd1";
constexpr char kManager[] = "org.freedesktop.systemd1.Manager";
constexpr std::chrono::seconds kPatience{30};

struct BusCloser {
    void operator()(sd_bus *bus) const { sd_bus_flush_close_unref(bus); }
};
struct MessageUnref {
    void operator()(sd_bus_message *message) const { sd_bus_message_unref(message); }
};
struct BusError {
    ~BusError() { sd_bus_error_free(&error); }
    std::string Text(int status) const {
        return error.message != nullptr ? error.message : std::strerror(-status);
    }
    sd_bus_error error = SD_BUS_ERROR_NULL;
};
using Bus = std::unique_ptr<sd_bus, BusCloser>;
using Message = std::unique_ptr<sd_bus_message, MessageUnref>;

// What has become of the jobs that ended since the reload was asked for.
struct AwaitedJob {
    std::string path; // known once systemd has answered
    std::string result;

    // A JobRemoved signal: id, job, unit, result.
    static int Removed(sd_bus_message *signal, void *context, sd_bus_error *) {
        auto *job = static_cast<AwaitedJob *>(context);
        const char *path = nullptr;
        const char *result = nullptr;
        if (sd_bus_message_read(signal, "uoss", nullptr, &path, nullptr, &result) >= 0 && job->path == path)
            job->result = result;
        return 0;
    }
};

std::string AwaitResult(sd_bus *bus, const AwaitedJob &job) {
    const auto deadline = std::chrono::steady_clock::now() + kPatience;
    while (job.result.empty()) {
        const int status = sd_bus_process(bus, nullptr);
        if (status < 0)
            return std::strerror(-status);
        const auto left = std::chrono::duration_cast<std::chrono::microseconds>(
            deadline - std::chrono::steady_clock::now());
        if (left.count() <= 0)
            return "no answer from systemd in time";
        if (status == 0)
            sd_bus_wait(bus, static_cast<uint64_t>(left.count()));
    }
    return job.result == "done" ? "" : "the reload ended as " + job.result;
}

} // namespace

std::string ReloadUnit(const std::string &unit) {
    sd_bus *rawBus = nullptr;
    int status = sd_bus_open_system(&rawBus);
    const Bus bus(rawBus);
    BusError error;
    AwaitedJob job;
    // Signals are taken from the bus only after the answer below has been read, so none is missed before the
    // path is known.
    if (status >= 0)
        status = sd_bus_match_signal(bus.get(), nullptr, kDestination, kPath, kManager, "JobRemoved",
                                     AwaitedJob::Removed, &job);
    if (status >= 0)
        status = sd_bus_call_method(bus.get(), kDestination, kPath, kManager, "Subscribe", &error.error,
                                    nullptr, "");
    sd_bus_message *rawReply = nullptr;
    if (status >= 0)
        status = sd_bus_call_method(bus.get(), kDestination, kPath, kManager, "ReloadUnit", &error.error,
                                    &rawReply, "ss", unit.c_str(), "replace");
    const Message reply(rawReply);
    const char *path = nullptr;
    if (status >= 0)
        status = sd_bus_message_read(reply.get(), "o", &path);
    if (status < 0)
        return error.Text(status);
    job.path = path;
    return AwaitResult(bus.get(), job);
}

} // namespace kelo::platform
