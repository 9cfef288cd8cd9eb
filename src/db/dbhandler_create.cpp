#include <syslog.h>

#include "db/shell.h"
#include "keloplatform/kelosystem.h"
#include "kelosyslog/dbhandler.h"
#include "kelosyslog/debuger.h"

int DBHandler::DBCreate() {
    const std::string folder = dbPath_.substr(0, dbPath_.rfind('/'));
    if (KELOFSMkdirP(folder.c_str(), 0, 1, -1, -1, 0777) < 0) {
        Debuger::MSG(0, "Fail to create folder: " + folder);
        return -1;
    }
    const std::string tool = "/usr/bin/sqlite3 \"" + dbPath_ + "\" ";
    if (!kelo::RunShell(tool + "< " + schemaPath_)) {
        Debuger::MSG(0, "Fail to create database: " + dbPath_ + "," + schemaPath_);
        return -1;
    }
    syslog(LOG_INFO, "create database: %s by %s", dbPath_.c_str(), schemaPath_.c_str());

    const std::string setWal = tool + "\"PRAGMA journal_mode=WAL;\"";
    if (!kelo::RunShell(setWal))
        Debuger::MSG(0, "Fail to set jounal mode as WAL, use DELETE by default " + setWal);
    return 0;
}
