#pragma once

// File system and service manager of the appliance.
//
// Threads: the functions may be called from any thread.

#include <string>

#include "keloplatform/export.h"

extern "C" {

// Creates `folder` with any missing parents. Each created folder gets `mode` less the process's umask, as
// mkdir(2) gives it, and owner `uid` and group `gid` (-1 leaves them). The second and third argument are
// ignored and called with 0 and 1.
//
// Returns 0, also when the folder is there already or "" names the root of an absolute path; -1 with errno
// set when something cannot be created or is not a folder. Parents created before a failure stay.
KELOPLATFORM_API int KELOFSMkdirP(const char *folder, int, int, int uid, int gid, unsigned int mode);

} // extern "C"

// Asks the service manager to reload a service, given without a suffix ("syslog-ng"), as a HUP signal would:
// it reopens its files and reads its configuration again. Where systemd runs, it is asked and its answer
// awaited; elsewhere, and under a root (KELORootSet), the process that the service's pid file names
// (/run/SERVICE.pid or /var/lib/SERVICE/SERVICE.pid), after a check that it is this service's program, gets a
// HUP signal. While a reload of the same service is in progress no second one is requested: its outcome is
// this call's too.
//
// Returns whether the service was reloaded; a failure is reported in the system log.
KELOPLATFORM_API bool KELOSystemdReload(const std::string &service);
