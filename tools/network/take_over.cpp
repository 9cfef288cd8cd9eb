#include "network/take_over.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <ctime>
#include <filesystem>
#include <optional>
#include <sstream>
#include <thread>

#include "base/atomic_file.h"
#include "base/errors.h"
#include "base/files.h"
#include "network/certificates.h"
#include "network/listeners.h"
#include "network/run_program.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

// The line that says what is wrong; syslog-ng shows a piece of the configuration behind it.
std::string ReasonIn(const std::string &output) {
    std::istringstream lines(output);
    for (std::string line; std::getline(lines, line);) {
        if (line.find("Error") != std::string::npos)
            return line.substr(line.find("Error"));
    }
    return output.substr(0, output.find('\n'));
}

// "" when syslog-ng accepts the configuration.
std::string Refusal(const std::string &path) {
    const ProgramRun run = RunAndWait({"syslog-ng", "--syntax-only", "--no-caps", "--cfgfile=" + path});
    return run.status == 0 ? "" : ReasonIn(run.output);
}

// A folder for a trial that disappears with the object.
class TrialFolder {
public:
    TrialFolder() {
        if (mkdtemp(path_.data()) == nullptr)
            throw OutputError("cannot create " + path_ + ": " + std::strerror(errno));
    }
    ~TrialFolder() {
        std::error_code ignored;
        fs::remove_all(path_, ignored);
    }
    TrialFolder(const TrialFolder &) = delete;
    TrialFolder &operator=(const TrialFolder &) = delete;

    std::string Write(const char *name, const std::string &text) const {
        AtomicFile file(path_ + "/" + name);
        file.Write(text);
        file.Commit();
        return path_ + "/" + name;
    }

    // A folder like that one, with links to its files and what is still missing there.
    std::string CopyTlsFiles(const std::string &folder) const {
        std::string copy = path_ + "/tls";
        fs::create_directory(copy);
        for (const char *name : {"/server.pem", "/server.key", "/ca.pem", "/crl.pem"})
            fs::create_symlink(fs::absolute(folder + name), copy + name);
        LinkRevocationLists(copy, InspectTlsFiles(copy, std::time(nullptr)));
        return copy;
    }

private:
    std::string path_ = (fs::temp_directory_path() / "kelosyslog-listen-XXXXXX").string();
};

// The line that every configuration begins with.
std::string VersionOf(const std::string &configuration) {
    std::istringstream lines(configuration);
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with("@version"))
            return line + "\n";
    }
    return "";
}

// The configuration with another file in place of the one that it includes.
std::string WithInclude(const std::string &configuration, const std::string &file) {
    std::istringstream lines(configuration);
    std::string text;
    for (std::string line; std::getline(lines, line);)
        text +=
            (line.starts_with("@define kelo_listen ") ? "@define kelo_listen \"" + file + "\"" : line) + "\n";
    return text;
}

// Why syslog-ng refuses our configuration alone with these settings; "" when it accepts it.
std::string Trial(const std::string &root, const NetworkSettings &settings) {
    const TrialFolder folder;
    std::string listen = WriteNetworkSettings(settings) + "@define kelo_count_refused \"off\"\n";
    if (settings.isTls)
        listen += "@define kelo_tls_dir \"" + folder.CopyTlsFiles(root + settings.tlsFolder) + "\"\n";
    const std::string file = folder.Write("listen.conf", listen);
    const std::string configuration = ReadWhole(ConfigurationPath(root)).value_or("");
    return Refusal(
        folder.Write("syslog-ng.conf", VersionOf(ReadWhole(MainConfigurationPath(root)).value_or("")) +
                                           WithInclude(configuration, file)));
}

bool IsSystemd() {
    return access("/run/systemd/system", F_OK) == 0;
}

// "" when it was done.
std::string RunStep(Step step) {
    const std::string verb = step == Step::kReload ? "reload" : "restart";
    if (IsSystemd()) // one that failed too often is not started again
        RunAndWait({"systemctl", "reset-failed", "syslog-ng.service"});
    const ProgramRun run = IsSystemd() ? RunAndWait({"systemctl", verb, "syslog-ng.service"})
                                       : RunAndWait({"service", "syslog-ng", verb});
    if (run.status == 0)
        return "";
    // systemd does not say why, but syslog-ng did.
    const ProgramRun said = IsSystemd() ? RunAndWait({"journalctl", "--quiet", "--unit=syslog-ng.service",
                                                      "--identifier=syslog-ng", "--lines=1", "--output=cat"})
                                        : run;
    return "the " + verb + " of syslog-ng failed: " + ReasonIn(said.output);
}

// "" when all configured sockets are open.
std::string MissingListener(const NetworkSettings &settings, pid_t syslogNg) {
    for (const Listener &listener : FindListeners(settings, syslogNg)) {
        if (!listener.isOpen)
            return "syslog-ng does not listen on " + listener.Name();
    }
    return "";
}

// "" when none is open that only the earlier settings ask for.
std::string LeftListener(const TakeOver &change, pid_t syslogNg) {
    const std::vector<Listener> earlier = ConfiguredListeners(change.before);
    for (const Listener &listener : FindListeners(change.after, syslogNg)) {
        const bool isEarlier = std::any_of(earlier.begin(), earlier.end(), [&](const Listener &other) {
            return other.isTcp == listener.isTcp && other.address == listener.address &&
                   other.port == listener.port;
        });
        if (isEarlier && !listener.isConfigured)
            return "syslog-ng still listens on " + listener.Name();
    }
    return "";
}

// Waits until syslog-ng has the sockets of the settings.
std::string AwaitListeners(const TakeOver &change) {
    using Clock = std::chrono::steady_clock;
    constexpr std::chrono::seconds kPatience{20};
    constexpr std::chrono::milliseconds kPause{50};
    for (const auto deadline = Clock::now() + kPatience;;) {
        const pid_t pid = change.findSyslogNg();
        std::string problem = pid == 0 ? "syslog-ng does not run" : MissingListener(change.after, pid);
        if (problem.empty())
            problem = LeftListener(change, pid);
        if (problem.empty() || Clock::now() >= deadline)
            return problem;
        std::this_thread::sleep_for(kPause);
    }
}

void WriteFile(const std::string &path, const std::string &text) {
    AtomicFile file(path);
    file.Write(text);
    file.Commit();
}

} // namespace

Step NeededStep(const NetworkSettings &before, const NetworkSettings &after, pid_t syslogNg) {
    if (before.address != after.address || !MissingListener(before, syslogNg).empty())
        return Step::kRestart;
    if (before == after)
        return Step::kNone;
    const std::vector<Listener> old = ConfiguredListeners(before);
    for (const Listener &listener : ConfiguredListeners(after)) {
        const bool isTaken = std::any_of(old.begin(), old.end(), [&](const Listener &other) {
            return other.isTcp == listener.isTcp && other.port == listener.port &&
                   (other.form != listener.form || other.isTls != listener.isTls);
        });
        if (isTaken)
            return Step::kRestart;
    }
    return Step::kReload;
}

void RequireAccepted(const std::string &root, const NetworkSettings &before, const NetworkSettings &after) {
    if (const std::string reason = Trial(root, after); !reason.empty())
        throw UsageError("syslog-ng would refuse its configuration: " + reason);
    // What the earlier settings break, the new ones may mend.
    const std::string reason = Refusal(MainConfigurationPath(root));
    if (!reason.empty() && Trial(root, before).empty())
        throw UsageError("syslog-ng refuses its configuration as it is (syslog-ng --syntax-only): " + reason);
}

void ApplySettings(const TakeOver &change) {
    const std::string path = ListenPath(change.root);
    const std::optional<std::string> earlier = ReadWhole(path);
    if (const std::string folder = change.root + change.after.tlsFolder; change.after.isTls)
        LinkRevocationLists(folder, InspectTlsFiles(folder, std::time(nullptr)));
    WriteFile(path, WriteNetworkSettings(change.after));
    if (change.step == Step::kNone)
        return;
    std::string problem = RunStep(change.step);
    if (problem.empty())
        problem = AwaitListeners(change);
    if (problem.empty())
        return;
    if (earlier)
        WriteFile(path, *earlier);
    else
        RemoveDurably(path);
    const std::string other = RunStep(Step::kRestart);
    throw OutputError("nothing was changed, as " + problem + " (journalctl -u syslog-ng)" +
                      (other.empty() ? "" : "; " + other));
}

} // namespace kelo::tool
