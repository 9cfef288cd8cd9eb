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
#include <functional>
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
using Texts = std::vector<std::string>;

// A child process that ends by a signal, at the latest with the object.
class Process {
public:
    // The child runs `act` with the end of a pipe that it closes or writes to when it is ready.
    explicit Process(const std::function<void(int ready)> &act) {
        int ready[2];
        EXPECT_EQ(pipe(ready), 0);
        pid_ = fork();
        if (pid_ == 0) {
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            close(ready[0]);
            act(ready[1]);
            _exit(127);
        }
        close(ready[1]);
        char byte;
        EXPECT_GE(read(ready[0], &byte, 1), 0);
        close(ready[0]);
    }
    ~Process() {
        if (pid_ > 0)
            Stop(SIGKILL);
    }
    Process(const Process &) = delete;
    Process &operator=(const Process &) = delete;

    std::string Pid() const { return std::to_string(pid_); }
    // The signal that ended it, sent or awaited.
    int Stop(int signal = 0) {
        kill(pid_, signal);
        int status = 0;
        waitpid(std::exchange(pid_, -1), &status, 0);
        return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
    }

private:
    pid_t pid_;
};

// A process of this name that ends when it gets a HUP signal.
Process Daemon(const char *name) {
    return Process([name](int ready) {
        prctl(PR_SET_NAME, name);
        std::signal(SIGHUP, SIG_DFL);
        close(ready);
        for (;;)
            pause();
    });
}

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
        Process daemon = Daemon(std::string(c.service).starts_with("pkg") ? "syslog-ng" : c.service);
        WritePidFile(c.file, daemon.Pid() + "\n");
        EXPECT_TRUE(KELOSystemdReload(c.service)) << c.file;
        EXPECT_EQ(daemon.Stop(), SIGHUP);
    }
    EXPECT_THAT(log_.Texts(), IsEmpty());
}

TEST_F(Reload, SparesEveryOtherProcess) {
    Process other = Daemon("postfix");
    Process gone = Daemon("syslog-ng");
    const std::string stale = gone.Pid();
    gone.Stop(SIGKILL);
    const struct {
        std::string service;
        std::string content;
        std::string reason;
    } cases[] = {
        {"syslog-ng", other.Pid(), "is not syslog-ng"},
        {"syslog-ng", stale, "is not syslog-ng"},
        {"syslog-ng", "", "no process id"},
        {"syslog-ng", "-1", "no process id"},
        {"syslog-ng", "0", "no process id"},
        {"syslog-ng", other.Pid() + " 1", "no process id"},
        {"syslog-ng", "99999999999", "no process id"},
        {"absent", "1", "no pid file"},
        {"../run/syslog-ng", other.Pid(), "not a service name"},
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
    PrivateSystemd(const std::string &address, std::string state, std::string result)
        : state_(std::move(state)), result_(std::move(result)), daemon_([&](int ready) {
              const std::string at = "--address=" + address;
              const std::string print = "--print-address=" + std::to_string(ready);
              execlp("dbus-daemon", "dbus-daemon", "--session", "--nofork", at.c_str(), print.c_str(),
                     nullptr);
          }) {
        EXPECT_TRUE(Offer());
        server_ = std::jthread([this](std::stop_token stop) {
            while (!stop.stop_requested() && sd_bus_process(bus_, nullptr) >= 0)
                sd_bus_wait(bus_, 20000);
        });
    }
    ~PrivateSystemd() {
        server_ = std::jthread();
        sd_bus_flush_close_unref(bus_);
    }
    PrivateSystemd(const PrivateSystemd &) = delete;
    PrivateSystemd &operator=(const PrivateSystemd &) = delete;

private:
    static constexpr char kJob[] = "/org/freedesktop/systemd1/job/7";

    bool Offer() {
        return sd_bus_open_system(&bus_) >= 0 &&
               sd_bus_add_fallback(bus_, nullptr, "/org/freedesktop/systemd1", Answer, this) >= 0 &&
               sd_bus_request_name(bus_, "org.freedesktop.systemd1", 0) >= 0;
    }
    void EndJob(const char *path, const std::string &result) {
        sd_bus_emit_signal(bus_, "/org/freedesktop/systemd1", "org.freedesktop.systemd1.Manager",
                           "JobRemoved", "uoss", 7, path, "syslog-ng.service", result.c_str());
    }
    // Its own job ends between the end of a foreign one and the answer, which is the hardest order.
    static int Answer(sd_bus_message *call, void *context, sd_bus_error *error) {
        auto *self = static_cast<PrivateSystemd *>(context);
        const std::string member = sd_bus_message_get_member(call);
        const char *first = nullptr;
        const char *second = nullptr;
        sd_bus_message_read(call, "ss", &first, &second);
        if (member == "Subscribe")
            return sd_bus_reply_method_return(call, nullptr);
        if (member == "Get" && std::string(second) == "ActiveState")
            return sd_bus_reply_method_return(call, "v", "s", self->state_.c_str());
        if (member == "ReloadUnit" && self->state_ != "active")
            return sd_bus_error_setf(error, "org.freedesktop.systemd1.Inactive", "%s is inactive.", first);
        self->EndJob("/org/freedesktop/systemd1/job/6", "failed");
        self->EndJob(kJob, self->result_);
        if (member == "Get")
            return sd_bus_reply_method_return(call, "v", "(uo)", 7, kJob);
        return sd_bus_reply_method_return(call, "o", kJob);
    }

    std::string state_;
    std::string result_;
    Process daemon_;
    sd_bus *bus_ = nullptr;
    std::jthread server_;
};

TEST_F(Reload, AsksSystemdAndAwaitsItsJob) {
    KELORootSet("");
    isBooted = 1;
    const struct {
        const char *state;
        const char *result;
        const char *message;
    } cases[] = {
        {"active", "done", nullptr},
        {"active", "failed", "cannot reload service syslog-ng: the reload ended as failed"},
        {"inactive", "done", "cannot reload service syslog-ng: syslog-ng.service is inactive."},
        {"reloading", "done", nullptr}, // under way already, and not asked for again
        {"reloading", "timeout", "cannot reload service syslog-ng: the reload ended as timeout"},
    };
    for (const auto &c : cases) {
        log_.Clear();
        const TempRoot folder;
        const std::string address = "unix:path=" + folder.File("bus");
        setenv("DBUS_SYSTEM_BUS_ADDRESS", address.c_str(), 1);
        const PrivateSystemd systemd(address, c.state, c.result);
        EXPECT_EQ(KELOSystemdReload("syslog-ng"), c.message == nullptr) << c.state << " " << c.result;
        EXPECT_EQ(log_.Texts(), c.message != nullptr ? Texts{c.message} : Texts{});
    }
    log_.Clear();
    EXPECT_FALSE(KELOSystemdReload("syslog-ng")); // the bus is gone
    unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    EXPECT_THAT(log_.Texts(), ElementsAre(HasSubstr("No such file")));
}

} // namespace
} // namespace kelo::test
