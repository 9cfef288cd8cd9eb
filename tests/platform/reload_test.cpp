// Asking for a reload: by pid file with real processes, and by D-Bus with a systemd of our own.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
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
        char before[16];
        prctl(PR_GET_NAME, before);
        prctl(PR_SET_NAME, name); // is inherited
        pid_ = fork();
        while (pid_ == 0)
            pause();
        prctl(PR_SET_NAME, before);
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

// A bus on which nobody is but a systemd, whose jobs end as `result` says. It is there for one connection.
class PrivateSystemd {
public:
    PrivateSystemd(const std::string &path, const char *state, const char *result)
        : state_(state), result_(result), socket_(socket(AF_UNIX, SOCK_STREAM, 0)) {
        sockaddr_un address{AF_UNIX, ""};
        path.copy(address.sun_path, sizeof address.sun_path - 1);
        EXPECT_EQ(bind(socket_, reinterpret_cast<const sockaddr *>(&address), sizeof address), 0);
        EXPECT_EQ(listen(socket_, 1), 0);
        setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + path).c_str(), 1);
        server_ = std::jthread([this] { Serve(accept(socket_, nullptr, nullptr)); });
    }
    ~PrivateSystemd() {
        shutdown(socket_, SHUT_RDWR); // ends the wait for a connection
        server_.join();
        close(socket_);
        unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    }
    PrivateSystemd(const PrivateSystemd &) = delete;
    PrivateSystemd &operator=(const PrivateSystemd &) = delete;

    int Reloads() const { return reloads_; }

private:
    static constexpr char kJob[] = "/org/freedesktop/systemd1/job/7";

    void Serve(int connection) {
        sd_bus *bus = nullptr;
        sd_bus_new(&bus);
        sd_bus_set_fd(bus, connection, connection);
        sd_bus_set_server(bus, 1, SD_ID128_MAKE(1, 2, 3, 4, 5, 6, 7, 8, 9, a, b, c, d, e, f, 0));
        sd_bus_add_filter(bus, nullptr, Answer, this);
        sd_bus_start(bus);
        while (sd_bus_process(bus, nullptr) >= 0 && sd_bus_wait(bus, UINT64_MAX) >= 0) {
        }
        sd_bus_unref(bus);
    }
    static void EndJob(sd_bus *bus, const char *job, const char *result) {
        sd_bus_message *signal = nullptr;
        sd_bus_message_new_signal(bus, &signal, "/org/freedesktop/systemd1",
                                  "org.freedesktop.systemd1.Manager", "JobRemoved");
        sd_bus_message_append(signal, "uoss", 7, job, "syslog-ng.service", result);
        sd_bus_message_set_sender(signal, "org.freedesktop.systemd1");
        sd_bus_send(bus, signal, nullptr);
        sd_bus_message_unref(signal);
    }
    // A job ends between the end of a foreign one and the answer, which is the hardest order.
    static int Answer(sd_bus_message *call, void *context, sd_bus_error *) {
        auto *self = static_cast<PrivateSystemd *>(context);
        sd_bus *bus = sd_bus_message_get_bus(call);
        const std::string member = sd_bus_message_get_member(call);
        const char *unit = "";
        const char *property = "";
        if (member == "Hello")
            return sd_bus_reply_method_return(call, "s", ":1.1");
        if (member == "Get") {
            sd_bus_message_read(call, "ss", nullptr, &property);
            if (property == std::string("ActiveState"))
                return sd_bus_reply_method_return(call, "v", "s", self->state_);
            EndJob(bus, kJob, self->result_);
            return sd_bus_reply_method_return(call, "v", "(uo)", 7, kJob);
        }
        if (member != "ReloadUnit")
            return sd_bus_reply_method_return(call, "");
        ++self->reloads_;
        sd_bus_message_read(call, "ss", &unit, nullptr);
        if (unit != std::string("syslog-ng.service") || self->state_ == std::string("inactive"))
            return sd_bus_reply_method_errorf(call, "org.freedesktop.systemd1.Inactive", "%s is inactive.",
                                              unit);
        EndJob(bus, "/org/freedesktop/systemd1/job/6", "failed");
        EndJob(bus, kJob, self->result_);
        return sd_bus_reply_method_return(call, "o", kJob);
    }

    const char *state_;
    const char *result_;
    int socket_;
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
        const PrivateSystemd systemd(folder.File("bus"), c.state, c.result);
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
