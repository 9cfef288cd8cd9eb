// kelosyslog listen: shows and changes where syslog-ng receives.

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "base/errors.h"
#include "base/files.h"
#include "cli/completion.h"
#include "cli/exit_status.h"
#include "commands/commands.h"
#include "network/requirements.h"
#include "network/take_over.h"
#include "print/output.h"
#include "status/listener_table.h"
#include "status/network.h"

namespace kelo::tool {
namespace {

namespace fs = std::filesystem;

constexpr const char *kFooter =
    "Without options of a change it prints where syslog-ng receives. A change is checked before anything is\n"
    "written: the address, the ports, the certificates, and whether syslog-ng accepts it. Then syslog-ng is\n"
    "reloaded, or restarted where it has to be, and the change is undone if it does not listen as it "
    "should.\n\n"
    "The address 'any' is every address of both families, 0.0.0.0 every one of IPv4. TLS needs certificates\n"
    "in /etc/kelosyslog/tls: docs/tls.md.\n\n"
    "Examples:\n"
    "  kelosyslog listen\n"
    "  kelosyslog listen --address any --dry-run\n"
    "  kelosyslog listen --address 192.0.2.1 --rate-limit 2000\n"
    "  kelosyslog listen --tls on --plain off\n\n"
    "Exit status: 0 done, 1 nothing to change, 2 refused, 4 syslog-ng does not take it over.";

constexpr uint64_t kMostPorts = 65535;
constexpr uint64_t kMostConnections = 1000; // three ports, and 4096 descriptors of syslog-ng
constexpr uint64_t kHighestRate = 1000000;

struct Options {
    std::string address;
    std::string port;
    std::string framePort;
    std::string tlsPort;
    std::string plain;
    std::string tls;
    std::string rate;
    std::string connections;
    std::string format = "text";
    bool isDryRun = false;

    bool IsChange() const {
        return !(address + port + framePort + tlsPort + plain + tls + rate + connections).empty();
    }
};

void TakeSwitch(const char *option, const std::string &text, bool &isOn) {
    if (text.empty())
        return;
    if (text != "on" && text != "off")
        throw UsageError(std::string(option) + ": '" + text + "' is neither on nor off");
    isOn = text == "on";
}

void TakePort(const char *option, const std::string &text, uint16_t &port) {
    if (!text.empty())
        port = static_cast<uint16_t>(ParseNumber(option, text, 1, kMostPorts));
}

NetworkSettings Changed(NetworkSettings settings, const Options &options) {
    if (!options.address.empty())
        settings.address = ResolveListenAddress(options.address);
    TakePort("--port", options.port, settings.port);
    TakePort("--frame-port", options.framePort, settings.framePort);
    TakePort("--tls-port", options.tlsPort, settings.tlsPort);
    TakeSwitch("--plain", options.plain, settings.isPlain);
    TakeSwitch("--tls", options.tls, settings.isTls);
    if (options.rate == "off") {
        settings.isRateLimited = false;
    } else if (!options.rate.empty()) {
        settings.rate = ParseNumber("--rate-limit", options.rate, 1, kHighestRate);
        settings.isRateLimited = true;
    }
    if (!options.connections.empty())
        settings.connections = ParseNumber("--connections", options.connections, 1, kMostConnections);
    return settings;
}

void Print(const std::string &text) {
    Output output(false);
    output.Write(text);
    output.Finish();
}

SyslogNgStatus FindSyslogNg(const std::string &root) {
    return GatherSyslogNg(root, "", std::chrono::seconds(2));
}

std::string Describe(const NetworkSettings &settings) {
    return "rate limit: " +
           (settings.isRateLimited ? std::to_string(settings.rate) + " messages a second of one address"
                                   : std::string("none")) +
           "; up to " + std::to_string(settings.connections) + " connections on each TCP port\n";
}

OutputFormat ParseTableFormat(const std::string &name) {
    const OutputFormat format = ParseOutputFormat(name);
    if (format == OutputFormat::Short)
        throw UsageError("--output: there is no form 'short' of this; forms are text, json, jsonl, csv, "
                         "spreadsheet");
    return format;
}

int Show(const NetworkSettings &settings, const std::string &root, const std::string &formatName) {
    const OutputFormat format = ParseTableFormat(formatName);
    const SyslogNgStatus syslogNg = FindSyslogNg(root);
    const NetworkStatus status = GatherNetwork(root, false, syslogNg);
    const std::vector<Listener> &listeners = status.isUsed ? status.listeners : ConfiguredListeners(settings);
    std::string text = TableOfListeners(listeners).Write(format, true);
    if (format == OutputFormat::Text) {
        text += Describe(settings);
        for (const std::string &line : FindNetworkProblems(status, syslogNg))
            text += "! " + line + "\n";
    }
    Print(text);
    return kExitFound;
}

const char *NameOf(Step step) {
    switch (step) {
    case Step::kReload:
        return "reload syslog-ng";
    case Step::kRestart:
        return "restart syslog-ng";
    case Step::kNone:
        break;
    }
    return "leave syslog-ng alone, as it does not run";
}

// Only one change at a time, as each may have to be undone. Nobody else can open the file.
FileHandle LockChanges(const std::string &root) {
    const std::string path = fs::path(ListenPath(root)).replace_filename(".listen.conf.lock");
    FileHandle file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!file)
        throw OutputError("cannot open " + path + ": " + std::strerror(errno));
    if (flock(file.Get(), LOCK_EX | LOCK_NB) != 0)
        throw UsageError("another kelosyslog listen is changing " + ListenPath(root));
    return file;
}

int Change(const Options &options, const std::string &root) {
    const OutputFormat format = ParseTableFormat(options.format);
    const FileHandle lock = options.isDryRun ? FileHandle() : LockChanges(root);
    const NetworkSettings before = ReadNetworkSettings(root);
    if (!IsConfigurationUsed(root))
        throw UsageError("syslog-ng does not read " + ConfigurationPath(root) + ": " +
                         ConfigurationLink(root) + " is missing");
    TakeOver change;
    change.root = root;
    change.before = before;
    change.after = Changed(before, options);
    change.after.internalSource = change.after.isTls ? FindInternalSource(root) : "";
    change.findSyslogNg = [&root] { return FindSyslogNg(root).pid; };
    const pid_t syslogNg = change.findSyslogNg();
    // The syslog-ng of another root is not a service of this machine.
    const bool isOurs = syslogNg != 0 && root.empty();
    change.step = isOurs ? NeededStep(before, change.after, syslogNg) : Step::kNone;
    if (change.after == before && change.step == Step::kNone) {
        Print(format == OutputFormat::Text
                  ? "nothing to change\n"
                  : TableOfListeners(ConfiguredListeners(before)).Write(format, true));
        return kExitNothing;
    }
    RequirePossible(change.after, root, syslogNg);
    RequireAccepted(root, before, change.after);
    if (options.isDryRun) {
        const std::string listeners = TableOfListeners(ConfiguredListeners(change.after)).Write(format, true);
        Print(format == OutputFormat::Text
                  ? "would write " + ListenPath(root) + " and " + NameOf(change.step) + ":\n" + listeners +
                        Describe(change.after)
                  : listeners);
        return kExitFound;
    }
    ApplySettings(change);
    return Show(change.after, root, options.format);
}

int Run(const Options &options, const std::string &root) {
    umask(022); // members of adm read the settings
    if (options.isDryRun && !options.IsChange())
        throw UsageError("--dry-run: goes with a change only");
    if (options.IsChange() && geteuid() != 0 && root.empty())
        throw UsageError("a change needs root");
    try {
        if (!options.IsChange())
            return Show(ReadNetworkSettings(root), root, options.format);
        RequireInclude(root);
        return Change(options, root);
    } catch (const SettingsError &error) {
        throw UsageError(error.what());
    }
}

} // namespace

void AddListen(Program &program) {
    auto options = std::make_shared<Options>();
    Command command = AddSubcommand(program, "listen", "Show and change where syslog-ng receives",
                                    [options, &program] { return Run(*options, program.root); });
    command.Footer(kFooter);
    command.AddText("--address", options->address, "ADDRESS",
                    "Receive on this address of the machine, or any");
    command.AddText("--port", options->port, "PORT", "UDP and TCP, one message a datagram or line (514)");
    command.AddText("--frame-port", options->framePort, "PORT", "TCP, messages with their lengths (601)");
    OfferWords(command.AddText("--plain", options->plain, "WHETHER",
                               "on or off: receive without encryption on these ports"),
               {"on", "off"});
    OfferWords(command.AddText("--tls", options->tls, "WHETHER",
                               "on or off: receive over TLS from devices with a certificate"),
               {"on", "off"});
    command.AddText("--tls-port", options->tlsPort, "PORT",
                    "TCP over TLS, messages with their lengths (6514)");
    command.AddText("--rate-limit", options->rate, "N",
                    "Drop what one address sends above N messages a second; off for no limit");
    command.AddText("--connections", options->connections, "N",
                    "Accept N connections on each TCP port (256)");
    command.AddFlag("--dry-run", options->isDryRun, "Check, and print what would be done");
    OfferWords(command.AddText("-o,--output", options->format, "FORMAT",
                               "text (default), json, jsonl, csv or spreadsheet"),
               {"text", "json", "jsonl", "csv", "spreadsheet"});
}

} // namespace kelo::tool
