// Asking for a reload: by pid file with real processes, and by D-Bus with a private bus and a systemd of our
// own.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <future>
#include <thread>

#include "keloplatform/kelosystem.h"
#include "keloplatform/root.h"
#include "support/syslog_capture.h"
#include "support/temp_root.h"

namespace {

int isBooted = 0;

} // namespace

extern "C" int sd_booted() {
    return isBooted;
}

namespace kelo::test {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

// A process of this name that ends when it gets a HUP signal, or otherwise with the object.
class Daemon {
public:
    explicit Daemon(const char *name) {
        int ready[2];
        EXPECT_EQ(pipe(ready), 0);
        pid_ = fork();
        if (pid_ == 0) {
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            prctl(PR_SET_NAME, name);
            std::signal(SIGHUP, SIG_DFL);
            close(ready[0]);
            close(ready[1]);
            for (;;)
                pause();
        }
        close(ready[1]);
        char byte;
        EXPECT_EQ(read(ready[0], &byte, 1), 0); // it has closed its end
        close(ready[0]);
    }
    ~Daemon() {
        if (pid_ > 0)
            Stop(SIGKILL);
    }
    Daemon(const Daemon &) = delete;
    Daemon &operator=(const Daemon &) = delete;

    pid_t Pid() const { return pid_; }
    // The signal that ended it, sent or awaited.
    int Stop(int signal = 0) {
        if (signal != 0)
            kill(pid_, signal);
        int status = 0;
        waitpid(std::exchange(pid_, -1), &status, 0);
        return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
    }

private:
    pid_t pid_;
};

class Reload : public testing::Test {
protected:
    Reload() { KELORootSet(root_.Path().c_str()); }
    ~Reload() override {
        KELORootSet("");
        isBooted = 0;
    }
    void WritePidFile(const std::string &path, const std::string &content) const {
        const std::string file = root_.Path() + path;
        std::filesystem::create_directories(std::filesystem::path(file).parent_path());
        WriteFile(file, content);
    }

    TempRoot root_;
    SyslogCapture log_;
};

TEST_F(Reload, HangsUpTheProgramThatAPidFileNames) {
    const struct {
        const char *service;
        const char *file;
    } cases[] = {
        {"syslog-ng", "/run/syslog-ng.pid"},
        {"syslog-ng", "/var/lib/syslog-ng/syslog-ng.pid"}, // the other one is stale by then
        {"pkg-Quillbay-syslog", "/run/pkg-Quillbay-syslog.pid"},
        {"a-service-with-a-long-name", "/run/a-service-with-a-long-name.pid"},
    };
    isBooted = 1; // is nothing to what stands under a root
    for (const auto &c : cases) {
        Daemon daemon(std::string(c.service).starts_with("pkg") ? "syslog-ng" : c.service);
        WritePidFile(c.file, std::to_string(daemon.Pid()) + "\n");
        EXPECT_TRUE(KELOSystemdReload(c.service)) << c.file;
        EXPECT_EQ(daemon.Stop(), SIGHUP);
    }
    EXPECT_THAT(log_.Texts(), IsEmpty());
}

TEST_F(Reload, SparesEveryOtherProcess) {
    Daemon other("postfix");
    Daemon gone("syslog-ng");
    const pid_t stale = gone.Pid();
    gone.Stop(SIGKILL);
    const struct {
        std::string service;
        std::string content;
        std::string reason;
    } cases[] = {
        {"syslog-ng", std::to_string(other.Pid()), "is not syslog-ng"},
        {"syslog-ng", std::to_string(stale), "is not syslog-ng"},
        {"syslog-ng", "", "no process id"},
        {"syslog-ng", "-1", "no process id"},
        {"syslog-ng", "0", "no process id"},
        {"syslog-ng", std::to_string(other.Pid()) + " 1", "no process id"},
        {"syslog-ng", "99999999999", "no process id"},
        {"absent", "1", "no pid file"},
        {"../run/syslog-ng", std::to_string(other.Pid()), "not a service name"},
        {"", "1", "not a service name"},
    };
    for (const auto &c : cases) {
        WritePidFile("/run/syslog-ng.pid", c.content);
        log_.Clear();
        EXPECT_FALSE(KELOSystemdReload(c.service)) << c.content;
        EXPECT_THAT(log_.Texts(), ElementsAre(HasSubstr(c.reason)));
    }
    EXPECT_EQ(other.Stop(SIGTERM), SIGTERM);
}

// A bus of our own on which a systemd answers whose jobs end as `result` says.
class PrivateSystemd {
public:
    PrivateSystemd(const TempRoot &root, std::string state, std::string result)
        : address_("unix:path=" + root.File("bus")), state_(std::move(state)), result_(std::move(result)) {
        WriteFile(
            root.File("bus.conf"),
            "<busconfig><listen>" + address_ +
                "</listen><auth>EXTERNAL</auth><policy context=\"default\"><allow send_destination=\"*\"/>"
                "<allow own=\"*\"/><allow eavesdrop=\"true\"/></policy></busconfig>");
        int ready[2];
        EXPECT_EQ(pipe(ready), 0);
        daemon_ = fork();
        if (daemon_ == 0) {
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            const std::string config = "--config-file=" + root.File("bus.conf");
            const std::string print = "--print-address=" + std::to_string(ready[1]);
            execlp("dbus-daemon", "dbus-daemon", "--nofork", config.c_str(), print.c_str(), nullptr);
            _exit(127);
        }
        close(ready[1]);
        char byte;
        isRunning_ = read(ready[0], &byte, 1) == 1;
        close(ready[0]);
        setenv("DBUS_SYSTEM_BUS_ADDRESS", address_.c_str(), 1);
        isRunning_ = isRunning_ && Offer();
        if (isRunning_)
            server_ = std::jthread([this](std::stop_token stop) {
                while (!stop.stop_requested() && sd_bus_process(bus_, nullptr) >= 0)
                    sd_bus_wait(bus_, 20000);
            });
    }
    ~PrivateSystemd() {
        server_ = std::jthread();
        sd_bus_flush_close_unref(bus_);
        kill(daemon_, SIGTERM);
        waitpid(daemon_, nullptr, 0);
        unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    }
    PrivateSystemd(const PrivateSystemd &) = delete;
    PrivateSystemd &operator=(const PrivateSystemd &) = delete;

    bool IsRunning() const { return isRunning_; }
    int Reloads() const { return reloads_; }

private:
    static constexpr char kJob[] = "/org/freedesktop/systemd1/job/7";

    bool Offer() {
        static const sd_bus_vtable manager[] = {
            SD_BUS_VTABLE_START(0), SD_BUS_METHOD("Subscribe", "", "", Subscribe, SD_BUS_VTABLE_UNPRIVILEGED),
            SD_BUS_METHOD("ReloadUnit", "ss", "o", ReloadUnit, SD_BUS_VTABLE_UNPRIVILEGED),
            SD_BUS_SIGNAL("JobRemoved", "uoss", 0), SD_BUS_VTABLE_END};
        static const sd_bus_vtable unit[] = {SD_BUS_VTABLE_START(0),
                                             SD_BUS_PROPERTY("ActiveState", "s", GetState, 0, 0),
                                             SD_BUS_PROPERTY("Job", "(uo)", GetJob, 0, 0), SD_BUS_VTABLE_END};
        return sd_bus_open_system(&bus_) >= 0 &&
               sd_bus_add_object_vtable(bus_, nullptr, "/org/freedesktop/systemd1",
                                        "org.freedesktop.systemd1.Manager", manager, this) >= 0 &&
               sd_bus_add_object_vtable(bus_, nullptr, "/org/freedesktop/systemd1/unit/syslog_2dng_2eservice",
                                        "org.freedesktop.systemd1.Unit", unit, this) >= 0 &&
               sd_bus_request_name(bus_, "org.freedesktop.systemd1", 0) >= 0;
    }
    void EndJob(const char *path, const std::string &result) {
        sd_bus_emit_signal(bus_, "/org/freedesktop/systemd1", "org.freedesktop.systemd1.Manager",
                           "JobRemoved", "uoss", 7, path, "syslog-ng.service", result.c_str());
    }
    static int Subscribe(sd_bus_message *call, void *, sd_bus_error *) {
        return sd_bus_reply_method_return(call, nullptr);
    }
    // Its own job ends between the end of a foreign one and the answer, which is the hardest order.
    static int ReloadUnit(sd_bus_message *call, void *context, sd_bus_error *error) {
        auto *self = static_cast<PrivateSystemd *>(context);
        const char *unit = nullptr;
        sd_bus_message_read(call, "ss", &unit, nullptr);
        ++self->reloads_;
        if (std::string(unit) != "syslog-ng.service" || self->state_ == "inactive")
            return sd_bus_error_setf(error, "org.freedesktop.systemd1.Inactive", "%s is inactive.", unit);
        self->EndJob("/org/freedesktop/systemd1/job/6", "failed");
        self->EndJob(kJob, self->result_);
        return sd_bus_reply_method_return(call, "o", kJob);
    }
    static int GetState(sd_bus *, const char *, const char *, const char *, sd_bus_message *reply,
                        void *context, sd_bus_error *) {
        return sd_bus_message_append(reply, "s", static_cast<PrivateSystemd *>(context)->state_.c_str());
    }
    static int GetJob(sd_bus *, const char *, const char *, const char *, sd_bus_message *reply,
                      void *context, sd_bus_error *) {
        auto *self = static_cast<PrivateSystemd *>(context);
        self->EndJob(kJob, self->result_);
        return sd_bus_message_append(reply, "(uo)", 7, kJob);
    }

    std::string address_;
    std::string state_;
    std::string result_;
    pid_t daemon_ = -1;
    bool isRunning_ = false;
    sd_bus *bus_ = nullptr;
    std::atomic<int> reloads_ = 0;
    std::jthread server_;
};

TEST_F(Reload, AsksSystemdAndAwaitsItsJob) {
    KELORootSet("");
    isBooted = 1;
    const struct {
        const char *state;
        const char *result;
        std::string reason; // "" for success
        int reloads;
    } cases[] = {
        {"active", "done", "", 1},
        {"active", "failed", "the reload ended as failed", 1},
        {"inactive", "done", "syslog-ng.service is inactive.", 1},
        {"reloading", "done", "", 0}, // under way already
        {"reloading", "timeout", "the reload ended as timeout", 0},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(std::string(c.state) + " " + c.result);
        log_.Clear();
        const TempRoot folder;
        const PrivateSystemd systemd(folder, c.state, c.result);
        ASSERT_TRUE(systemd.IsRunning());
        EXPECT_EQ(KELOSystemdReload("syslog-ng"), c.reason.empty());
        EXPECT_EQ(systemd.Reloads(), c.reloads);
        if (c.reason.empty()) {
            EXPECT_THAT(log_.Texts(), IsEmpty());
        } else {
            EXPECT_THAT(log_.Texts(), ElementsAre("cannot reload service syslog-ng: " + c.reason));
        }
    }
    log_.Clear();
    setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + root_.File("no bus")).c_str(), 1);
    EXPECT_FALSE(KELOSystemdReload("syslog-ng"));
    unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    EXPECT_THAT(log_.Texts(), ElementsAre(HasSubstr("No such file")));
}

} // namespace
} // namespace kelo::test
