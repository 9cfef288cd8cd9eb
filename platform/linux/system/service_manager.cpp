#include "system/service_manager.h"

#include <systemd/sd-bus.h>
#include <systemd/sd-daemon.h>

#include <chrono>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "system/late_function.h"

namespace kelo::platform {
namespace {

#define KELO_SYSTEMD(name) constinit const LateFunction<decltype(::name)> name("libsystemd.so.0", #name)
KELO_SYSTEMD(sd_booted);
KELO_SYSTEMD(sd_bus_call_method);
KELO_SYSTEMD(sd_bus_error_free);
KELO_SYSTEMD(sd_bus_flush_close_unref);
KELO_SYSTEMD(sd_bus_get_property);
KELO_SYSTEMD(sd_bus_get_property_string);
KELO_SYSTEMD(sd_bus_match_signal);
KELO_SYSTEMD(sd_bus_message_read);
KELO_SYSTEMD(sd_bus_message_unref);
KELO_SYSTEMD(sd_bus_open_system);
KELO_SYSTEMD(sd_bus_path_encode);
KELO_SYSTEMD(sd_bus_process);
KELO_SYSTEMD(sd_bus_wait);
#undef KELO_SYSTEMD

constexpr char kDestination[] = "org.freedesktop.systemd1";
constexpr char kPath[] = "/org/freedesktop/systemd1";
constexpr char kManager[] = "org.freedesktop.systemd1.Manager";
constexpr char kUnit[] = "org.freedesktop.systemd1.Unit";
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
using CText = std::unique_ptr<char, void (*)(void *)>;
using Message = std::unique_ptr<sd_bus_message, MessageUnref>;

// The results of the jobs that ended since the reload was requested.
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

// The job that is reloading the unit at the moment; "" for none, or if that is unknown.
std::string JobUnderWay(sd_bus *bus, const std::string &unit) {
    char *rawObject = nullptr;
    if (sd_bus_path_encode("/org/freedesktop/systemd1/unit", unit.c_str(), &rawObject) < 0)
        return "";
    const CText object(rawObject, std::free);
    char *rawState = nullptr;
    if (sd_bus_get_property_string(bus, kDestination, object.get(), kUnit, "ActiveState", nullptr,
                                   &rawState) < 0)
        return "";
    const CText state(rawState, std::free);
    if (std::strcmp(state.get(), "reloading") != 0)
        return "";
    sd_bus_message *rawJob = nullptr;
    if (sd_bus_get_property(bus, kDestination, object.get(), kUnit, "Job", nullptr, &rawJob, "(uo)") < 0)
        return "";
    const Message job(rawJob);
    uint32_t id = 0;
    const char *path = nullptr;
    return sd_bus_message_read(job.get(), "(uo)", &id, &path) >= 0 && id != 0 ? path : "";
}

// Stores the path of the job in `path`. Returns the status of the bus.
int AskForReload(sd_bus *bus, const std::string &unit, BusError &error, std::string &path) {
    sd_bus_message *rawReply = nullptr;
    int status = sd_bus_call_method(bus, kDestination, kPath, kManager, "ReloadUnit", &error.error, &rawReply,
                                    "ss", unit.c_str(), "replace");
    const Message reply(rawReply);
    const char *text = nullptr;
    if (status >= 0)
        status = sd_bus_message_read(reply.get(), "o", &text);
    if (status >= 0)
        path = text;
    return status;
}

} // namespace

bool IsSystemdRunning() {
    return sd_booted.IsThere() && sd_booted() > 0;
}

std::string ReloadUnit(const std::string &unit) {
    sd_bus *rawBus = nullptr;
    int status = sd_bus_open_system(&rawBus);
    const Bus bus(rawBus);
    BusError error;
    AwaitedJob job;
    // Signals are read from the bus only after the job's path is known, so none is missed.
    if (status >= 0)
        status = sd_bus_match_signal(bus.get(), nullptr, kDestination, kPath, kManager, "JobRemoved",
                                     AwaitedJob::Removed, &job);
    if (status >= 0)
        status = sd_bus_call_method(bus.get(), kDestination, kPath, kManager, "Subscribe", &error.error,
                                    nullptr, "");
    if (status >= 0)
        job.path = JobUnderWay(bus.get(), unit);
    if (status >= 0 && job.path.empty())
        status = AskForReload(bus.get(), unit, error, job.path);
    return status < 0 ? error.Text(status) : AwaitResult(bus.get(), job);
}

} // namespace kelo::platform
