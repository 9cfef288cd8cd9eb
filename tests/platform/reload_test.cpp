// Asking for a reload: by pid file with real processes, and by D-Bus where no bus answers.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>

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
        prctl(PR_SET_NAME, name); // the child inherits it
        pid_ = fork();
        if (pid_ == 0) {
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            for (;;)
                pause();
        }
        prctl(PR_SET_NAME, before);
    }
    ~Daemon() {
        if (pid_ > 0)
            Stop(SIGKILL);
    }
    Daemon(const Daemon &) = delete;
    Daemon &operator=(const Daemon &) = delete;

    std::string Pid() const { return std::to_string(pid_); }
    // The signal that ended it, sent or awaited.
    int Stop(int signal = 0) {
        kill(pid_, signal);
        int status = 0;
        waitpid(std::exchange(pid_, -1), &status, 0);
        return WIFSIGNALED(status) ? WTERMSIG(status) : 0;
    }

private:
    pid_t pid_ = -1;
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
    const std::pair<const char *, const char *> cases[] = {
        {"syslog-ng", "/run/syslog-ng.pid"},
        {"syslog-ng", "/var/lib/syslog-ng/syslog-ng.pid"}, // the other one is stale by then
        {"pkg-Quillbay-syslog", "/run/pkg-Quillbay-syslog.pid"},
        {"a-service-with-a-long-name", "/run/a-service-with-a-long-name.pid"},
    };
    isBooted = 1; // is nothing to what stands under a root
    for (const auto &[service, file] : cases) {
        Daemon daemon(std::string(service).starts_with("pkg") ? "syslog-ng" : service);
        WritePidFile(file, daemon.Pid() + "\n");
        EXPECT_TRUE(KELOSystemdReload(service)) << file;
        EXPECT_EQ(daemon.Stop(), SIGHUP);
    }
    EXPECT_THAT(log_.Texts(), IsEmpty());
}

TEST_F(Reload, SparesEveryOtherProcess) {
    Daemon other("postfix");
    Daemon gone("syslog-ng");
    const std::string stale = gone.Pid();
    gone.Stop(SIGKILL);
    const struct {
        std::string service, content, reason;
    } cases[] = {
        {"syslog-ng", other.Pid(), "is not syslog-ng"},
        {"syslog-ng", stale, "is not syslog-ng"},
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

TEST_F(Reload, FailsWithoutTheBusOfSystemd) {
    KELORootSet("");
    isBooted = 1;
    setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + root_.File("no bus")).c_str(), 1);
    EXPECT_FALSE(KELOSystemdReload("syslog-ng"));
    unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    EXPECT_THAT(log_.Texts(), ElementsAre(HasSubstr("No such file")));
}

} // namespace
} // namespace kelo::test
