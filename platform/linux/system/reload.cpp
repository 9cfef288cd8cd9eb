#include <new>

#include "common/failure.h"
#include "common/root.h"
#include "keloplatform/kelosystem.h"
#include "system/pid_file.h"
#include "system/service_manager.h"

namespace {

// The program that a service runs: the package's own service runs a syslog-ng too.
std::string ProgramOf(const std::string &service) {
    return service == "pkg-Quillbay-syslog" ? "syslog-ng" : service;
}

bool IsServiceName(const std::string &service) {
    return !service.empty() && service.find('/') == std::string::npos &&
           service.find('\0') == std::string::npos;
}

// A process under another root is not a service of this machine.
bool IsManagedBySystemd() {
    return kelo::platform::RootedPath("/") == "/" && kelo::platform::IsSystemdRunning();
}

} // namespace

bool KELOSystemdReload(const std::string &service) {
    kelo::platform::ClearFailure();
    std::string problem = "not a service name";
    if (IsServiceName(service)) {
        problem = IsManagedBySystemd() ? kelo::platform::ReloadUnit(service + ".service")
                                       : kelo::platform::HangUpByPidFile(service, ProgramOf(service));
    }
    if (problem.empty())
        return true;
    kelo::platform::Fail(KELO_FAILURE_OTHER, "KELOSystemdReload", "", problem);
    kelo::platform::ReportFailure("cannot reload service %s: %s", service.c_str(), problem.c_str());
    return false;
}
