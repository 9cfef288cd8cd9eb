// Asking for a reload: by pid file with real processes, and by D-Bus with a systemd of our own.

#include <sys/socket.h>
#include <sys/un.h>
#include <systemd/sd-bus.h>

#include <thread>

#include "keloplatform/errors.h"
#include "keloplatform/kelosystem.h"
#include "keloplatform/root.h"
#include "support/child_program.h"
#include "support/test.h"

namespace {

int isBooted = 0;

} // namespace

extern "C" int sd_booted() {
    return isBooted;
}

namespace kelo::test {
namespace {

class Reload : public testing::Test {
protected:
    Reload() {
        KELORootSet(root_.Path().c_str());
        PlatformCalls::answers.reload.reset();
    }
    ~Reload() override {
        KELORootSet("");
        isBooted = 0;
    }
    // A process of this name, which any signal ends.
    std::unique_ptr<ChildProgram> Start(const std::string &name) const {
        fs::remove(root_.File(name));
        fs::create_symlink("/bin/sleep", root_.File(name));
        auto daemon = std::make_unique<ChildProgram>(root_.Path(), "exec ./" + name + " 1000");
        EXPECT_TRUE(daemon->AwaitName(name));
        return daemon;
    }

    TempRoot root_;
    SyslogCapture log_;
};

TEST_F(Reload, HangsUpTheProgramThatAPidFileNames) {
    const std::pair<std::string, const char *> cases[] = {
        {"syslog-ng", "run/syslog-ng.pid"},
        {"syslog-ng", "var/lib/syslog-ng/syslog-ng.pid"}, // the other one is stale by then
        {"pkg-Quillbay-syslog", "run/pkg-Quillbay-syslog.pid"},
        {"a-service-with-a-long-name", "run/a-service-with-a-long-name.pid"},
    };
    isBooted = 1; // has no effect under a root
    for (const auto &[service, file] : cases) {
        const auto daemon = Start(service.starts_with("pkg") ? "syslog-ng" : service);
        WriteFile(root_.File(file), std::to_string(daemon->Pid()) + "\n");
        EXPECT_TRUE(KELOSystemdReload(service)) << file;
        EXPECT_EQ(daemon->AwaitEnd().status, -SIGHUP);
    }
    EXPECT_THAT(log_.TakeTexts(), IsEmpty());
}

TEST_F(Reload, SparesEveryOtherProcess) {
    const auto postfix = Start("postfix"), gone = Start("syslog-ng");
    const std::string other = std::to_string(postfix->Pid());
    kill(gone->Pid(), SIGKILL);
    gone->AwaitEnd();
    const std::tuple<const char *, std::string, const char *> cases[] = {
        {"syslog-ng", other, "is not syslog-ng"},
        {"syslog-ng", std::to_string(gone->Pid()), "is not syslog-ng"},
        {"syslog-ng", "", "no process id"},
        {"syslog-ng", "-1", "no process id"},
        {"syslog-ng", "0", "no process id"},
        {"syslog-ng", other + " 1", "no process id"},
        {"syslog-ng", "99999999999", "no process id"},
        {"absent", "1", "no pid file"},
        {"../run/syslog-ng", other, "not a service name"},
        {"", "1", "not a service name"},
    };
    for (const auto &[service, content, reason] : cases) {
        WriteFile(root_.File("run/syslog-ng.pid"), content);
        EXPECT_FALSE(KELOSystemdReload(service)) << content;
        const std::vector<std::string> texts = log_.TakeTexts();
        EXPECT_THAT(texts, ElementsAre(HasSubstr(reason)));
        EXPECT_EQ(KELOErrorGet(), texts.at(0));
    }
    kill(postfix->Pid(), SIGTERM);
    EXPECT_EQ(postfix->AwaitEnd().status, -SIGTERM);
}

constexpr char kJob[] = "/org/freedesktop/systemd1/job/7";

// A systemd alone on its bus, for one connection.
struct PrivateSystemd {
    std::string state;  // of the unit
    std::string result; // of its jobs
    int reloads = 0;

    void Serve(int listener) {
        const int connection = accept(listener, nullptr, nullptr);
        sd_bus *bus = nullptr;
        sd_bus_new(&bus);
        sd_bus_set_fd(bus, connection, connection);
        sd_bus_set_server(bus, 1, SD_ID128_NULL);
        sd_bus_add_filter(bus, nullptr, Answer, this);
        sd_bus_start(bus);
        while (sd_bus_process(bus, nullptr) >= 0 && sd_bus_wait(bus, UINT64_MAX) >= 0) {
        }
        sd_bus_unref(bus);
    }
    static void EndJob(sd_bus *bus, const char *job, const std::string &result) {
        sd_bus_message *signal = nullptr;
        sd_bus_message_new_signal(bus, &signal, "/org/freedesktop/systemd1",
                                  "org.freedesktop.systemd1.Manager", "JobRemoved");
        sd_bus_message_append(signal, "uoss", 7, job, "syslog-ng.service", result.c_str());
        sd_bus_message_set_sender(signal, "org.freedesktop.systemd1");
        sd_bus_send(bus, signal, nullptr);
        sd_bus_message_unref(signal);
    }
    // A job ends between the end of a foreign one and the answer, which is the hardest order.
    static int Answer(sd_bus_message *call, void *context, sd_bus_error *) {
        auto *self = static_cast<PrivateSystemd *>(context);
        const std::string member = sd_bus_message_get_member(call);
        const char *words[] = {"", ""}; // unit and mode, or interface and property
        sd_bus_message_read(call, "ss", &words[0], &words[1]);
        if (member == "Hello")
            return sd_bus_reply_method_return(call, "s", ":1.1");
        if (words[1] == std::string("ActiveState"))
            return sd_bus_reply_method_return(call, "v", "s", self->state.c_str());
        if (member != "ReloadUnit" && member != "Get")
            return sd_bus_reply_method_return(call, "");
        if (member == "ReloadUnit" && ++self->reloads > 0)
            EndJob(sd_bus_message_get_bus(call), "/org/freedesktop/systemd1/job/6", "failed");
        EndJob(sd_bus_message_get_bus(call), kJob, self->result);
        if (member == "Get")
            return sd_bus_reply_method_return(call, "v", "(uo)", 7, kJob);
        if (self->state == "inactive")
            return sd_bus_reply_method_errorf(call, "org.freedesktop.systemd1.Inactive", "%s is inactive.",
                                              words[0]);
        return sd_bus_reply_method_return(call, "o", kJob);
    }
};

TEST_F(Reload, AsksSystemdAndAwaitsItsJob) {
    KELORootSet("");
    isBooted = 1;
    // State of the unit, result of the job, reason of a failure, and reloads that were asked for.
    const std::tuple<const char *, const char *, std::string, int> cases[] = {
        {"active", "done", "", 1},
        {"active", "failed", "the reload ended as failed", 1},
        {"inactive", "done", "syslog-ng.service is inactive.", 1},
        {"reloading", "done", "", 0}, // under way already
        {"reloading", "timeout", "the reload ended as timeout", 0},
    };
    sockaddr_un address{AF_UNIX, ""};
    root_.File("bus").copy(address.sun_path, sizeof address.sun_path - 1);
    const int listener = socket(AF_UNIX, SOCK_STREAM, 0);
    ASSERT_EQ(bind(listener, reinterpret_cast<const sockaddr *>(&address), sizeof address), 0);
    ASSERT_EQ(listen(listener, 1), 0);
    setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + root_.File("bus")).c_str(), 1);
    for (const auto &[state, result, reason, reloads] : cases) {
        SCOPED_TRACE(std::string(state) + " " + result);
        PrivateSystemd systemd{state, result};
        std::thread server([&] { systemd.Serve(listener); });
        EXPECT_EQ(KELOSystemdReload("syslog-ng"), reason.empty());
        server.join();
        EXPECT_EQ(systemd.reloads, reloads);
        const std::string text = reason.empty() ? "" : "cannot reload service syslog-ng: " + reason;
        EXPECT_EQ(KELOErrorGet(), text);
        EXPECT_EQ(log_.TakeTexts(), std::vector<std::string>(text.empty() ? 0 : 1, text));
    }
    close(listener);
    setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + root_.File("no bus")).c_str(), 1);
    EXPECT_FALSE(KELOSystemdReload("syslog-ng"));
    unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    EXPECT_THAT(log_.TakeTexts(), ElementsAre(HasSubstr("No such file")));
}

} // namespace
} // namespace kelo::test
