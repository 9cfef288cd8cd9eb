#include "status/network.h"

#include <ctime>
#include <fstream>

#include "network/certificates.h"
#include "status/figures.h"

namespace kelo::tool {
namespace {

constexpr uint64_t kReceiveBuffer = 4194304; // that the configuration asks for
constexpr uint64_t kNearlyAllPercent = 90;

void LookAtListener(const Listener &listener, std::vector<std::string> &lines) {
    if (listener.isKnown && !listener.isOpen)
        lines.push_back("syslog-ng does not listen on " + listener.Name() +
                        ", as its configuration says: systemctl restart syslog-ng");
    if (listener.mostConnections > 0 &&
        listener.connections * 100 >= listener.mostConnections * kNearlyAllPercent)
        lines.push_back(Counted(listener.connections, "connection") + " of " +
                        Grouped(listener.mostConnections) + " on " + listener.Name() +
                        " are in use; further devices are turned away");
    if (listener.drops == 0)
        return;
    uint64_t largest = 0;
    std::ifstream("/proc/sys/net/core/rmem_max") >> largest;
    lines.push_back("the kernel dropped " + Counted(listener.drops, "datagram") + " on " + listener.Name() +
                    (largest < kReceiveBuffer ? ", whose buffer is limited by net.core.rmem_max to " +
                                                    Bytes(static_cast<int64_t>(largest))
                                              : ""));
}

} // namespace

NetworkStatus GatherNetwork(const std::string &root, bool isOther, const SyslogNgStatus &syslogNg) {
    NetworkStatus status;
    status.isUsed = !isOther && IsConfigurationUsed(root);
    if (!status.isUsed)
        return status;
    try {
        status.settings = ReadNetworkSettings(root);
    } catch (const SettingsError &error) {
        status.problem = error.what();
        return status;
    }
    status.listeners = syslogNg.pid != 0 ? FindListeners(status.settings, syslogNg.pid)
                                         : ConfiguredListeners(status.settings);
    if (status.settings.isTls) {
        TlsFiles files = InspectTlsFiles(root + status.settings.tlsFolder, std::time(nullptr));
        status.tlsProblems = std::move(files.faults);
        status.tlsProblems.insert(status.tlsProblems.end(), files.warnings.begin(), files.warnings.end());
    }
    return status;
}

std::vector<std::string> FindNetworkProblems(const NetworkStatus &status, const SyslogNgStatus &syslogNg) {
    std::vector<std::string> lines;
    if (!status.problem.empty())
        lines.push_back(status.problem);
    for (const Listener &listener : status.listeners)
        LookAtListener(listener, lines);
    if (syslogNg.aboveRate > 0)
        lines.push_back("syslog-ng dropped " + Counted(syslogNg.aboveRate, "message") +
                        " of addresses that sent more than " + Grouped(status.settings.rate) +
                        " a second (kelosyslog listen)");
    if (syslogNg.refusedTls > 0)
        lines.push_back("TLS: syslog-ng refused " + Counted(syslogNg.refusedTls, "connection") +
                        " since its start; its messages of SSL and certificates in the system log say why");
    for (const std::string &problem : status.tlsProblems)
        lines.push_back("TLS: " + problem);
    return lines;
}

} // namespace kelo::tool
