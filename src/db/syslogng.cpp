#include <sys/stat.h>

#include <cerrno>

#include "common/failure.h"
#include "common/report.h"
#include "common/root.h"
#include "db/database_files.h"
#include "db/database_lock.h"
#include "db/shell.h"
#include "keloplatform/kelosystem.h"
#include "keloplatform/torvc.h"
#include "kelosyslog/dbhandler.h"

int32_t SyslogngHupSignalSend() {
    const bool packageEnabled = TORVCFileExist(kelo::RootedPath("/var/packages/Quillbay/enabled").c_str());
    const std::string service = packageEnabled ? "pkg-Quillbay-syslog" : "syslog-ng";
    if (!KELOSystemdReload(service)) {
        kelo::FailPlatform("", "KELOSystemdReload");
        kelo::ReportError("Fail to send HUP signal to " + service);
        return -1;
    }
    return 0;
}

int64_t SyslogngWorkingDbCheck(std::string dbPath, int32_t limitKib) {
    struct stat status {};
    if (stat(dbPath.c_str(), &status) != 0)
        return kelo::FailWithErrno(dbPath, "stat", errno);
    if (!S_ISREG(status.st_mode)) {
        kelo::ReportError("Working database is not regular file");
        return kelo::Fail(KELO_FAILURE_ARGUMENT, dbPath, "stat", "it is no regular file");
    }
    if (int64_t{status.st_size} / 1024 > limitKib) {
        {
            const kelo::DatabaseLock lock(dbPath);
            if (lock.MayGoOn())
                kelo::RemoveDatabase(dbPath);
        }
        SyslogngHupSignalSend();
    }
    return 0;
}

int32_t SyslogngWorkingDbSetJouWal(std::string dbPath) {
    if (!kelo::RunShell("/usr/bin/sqlite3 " + dbPath + " \"PRAGMA journal_mode=WAL;\"")) {
        kelo::FailPlatform(dbPath, "TORVCExec");
        kelo::ReportError("Fail to set jounal mode as WAL, use DELETE by default");
        return -1;
    }
    return 0;
}
